// SPDX-License-Identifier: Apache-2.0
//
// JSON as text; in a library of its own, for not all of base/ needs jsoncpp.
#pragma once

#include <string>

#include <json/json.h>

namespace lookhaven::base {

// Without spaces or line breaks, in ASCII alone; the same text for equal values.
std::string OneLineJson(const Json::Value& value);

// What OneLineJson wrote; null for an empty or any other text.
Json::Value ParseOneLineJson(const std::string& text);

// For people: a member in each line, indented by two spaces, in UTF-8. Ends without a line break.
std::string IndentedJson(const Json::Value& value);

}  // namespace lookhaven::base
