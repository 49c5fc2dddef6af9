// SPDX-License-Identifier: Apache-2.0
//
// JSON as commands read it and put it together.
#pragma once

#include <string>

#include <json/json.h>

namespace lookhaven::cli {

// Null for what is no JSON or nested too deeply.
Json::Value ParseJson(const std::string& text);

// An object of names, each followed by its value: Object("id", 5, "name", "Gate").
inline Json::Value Object() {
    return Json::objectValue;
}
template <typename Value, typename... Members>
Json::Value Object(const char* name, const Value& value, const Members&... members) {
    Json::Value object = Object(members...);
    object[name] = value;
    return object;
}

// What data_of makes of each record.
template <typename Records, typename DataOf>
Json::Value Array(const Records& records, DataOf data_of) {
    Json::Value array(Json::arrayValue);
    for (const auto& record : records) {
        array.append(data_of(record));
    }
    return array;
}

}  // namespace lookhaven::cli
