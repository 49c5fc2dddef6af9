// SPDX-License-Identifier: Apache-2.0
//
// Records in answers by their ids and names.
#pragma once

#include <json/json.h>

namespace lookhaven::api {

// Appends {"id", "name"} of the record to an array, and returns it for more to be added; valid until the next append.
template <typename Record>
Json::Value& AppendNamed(Json::Value& list, const Record& record) {
    Json::Value& json = list.append(Json::objectValue);
    json["id"] = record.id;
    json["name"] = record.name;
    return json;
}

// add(json, record) adds the other members of each.
template <typename Records, typename Add>
Json::Value NamedList(const Records& records, Add add) {
    Json::Value list = Json::arrayValue;
    for (const auto& record : records) {
        add(AppendNamed(list, record), record);
    }
    return list;
}

template <typename Records>
Json::Value NamedList(const Records& records) {
    return NamedList(records, [](Json::Value&, const auto&) {});
}

}  // namespace lookhaven::api
