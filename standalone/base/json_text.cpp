// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/json_text.h"

#include <memory>

namespace lookhaven::base {

std::string OneLineJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

Json::Value ParseOneLineJson(const std::string& text) {
    Json::Value value;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    const bool is_json = reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
    return is_json ? value : Json::Value();
}

std::string IndentedJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

}  // namespace lookhaven::base
