// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/json.h"

#include <memory>

namespace lookhaven::cli {

Json::Value ParseJson(const std::string& text) {
    Json::CharReaderBuilder builder;
    builder["stackLimit"] = 8;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string ignored;
    try {
        return reader->parse(text.data(), text.data() + text.size(), &value, &ignored) ? value : Json::Value();
    } catch (const Json::Exception&) {
        return {};  // nested too deeply
    }
}

}  // namespace lookhaven::cli
