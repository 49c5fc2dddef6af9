// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/emap_json.h"

namespace lookhaven::store {

namespace {

constexpr struct {
    const char* name;
    int EmapItem::*member;
} kNumbers[] = {{"id", &EmapItem::device_id},
                {"hxId", &EmapItem::server_id},
                {"x", &EmapItem::x},
                {"y", &EmapItem::y},
                {"direction", &EmapItem::direction},
                {"textPos", &EmapItem::text_pos},
                {"iconCenterX", &EmapItem::icon_center_x},
                {"iconCenterY", &EmapItem::icon_center_y},
                {"portIdx", &EmapItem::port}};

}  // namespace

Json::Value ToJson(const std::vector<EmapItem>& items) {
    Json::Value list(Json::arrayValue);
    for (const EmapItem& item : items) {
        Json::Value& json = list.append(Json::objectValue);
        json["type"] = static_cast<int>(item.type);
        json["name"] = item.name;
        for (const auto& number : kNumbers) {
            json[number.name] = item.*number.member;
        }
    }
    return list;
}

std::vector<EmapItem> EmapItemsFromJson(const Json::Value& list) {
    if (!list.isArray()) {
        throw InvalidRecord("the items of an e-map are a list");
    }
    std::vector<EmapItem> items;
    for (const Json::Value& json : list) {
        if (!json.isObject() || !json["type"].isInt() || !(json["name"].isNull() || json["name"].isString())) {
            throw InvalidRecord("an e-map item is an object with a number \"type\" and a text \"name\"");
        }
        EmapItem item;
        item.type = static_cast<EmapItemType>(json["type"].asInt());
        item.name = json["name"].asString();
        for (const auto& number : kNumbers) {
            const Json::Value& value = json[number.name];
            if (!value.isNull() && !value.isInt()) {
                throw InvalidRecord(std::string("an e-map item's \"") + number.name + "\" is a whole number");
            }
            if (!value.isNull()) {
                item.*number.member = value.asInt();
            }
        }
        items.push_back(item);
    }
    return items;
}

}  // namespace lookhaven::store
