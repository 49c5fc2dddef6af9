// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/json_text.h"

namespace lookhaven::base {

std::string OneLineJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

std::string IndentedJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

}  // namespace lookhaven::base
