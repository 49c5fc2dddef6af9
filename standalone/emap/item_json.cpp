// SPDX-License-Identifier: Apache-2.0
#include "standalone/emap/item_json.h"

namespace lookhaven::emap {

namespace {

constexpr struct {
    const char* name;
    int store::EmapItem::*member;
} kNumbers[] = {{"id", &store::EmapItem::device_id},
                {"hxId", &store::EmapItem::server_id},
                {"x", &store::EmapItem::x},
                {"y", &store::EmapItem::y},
                {"direction", &store::EmapItem::direction},
                {"textPos", &store::EmapItem::text_pos},
                {"iconCenterX", &store::EmapItem::icon_center_x},
                {"iconCenterY", &store::EmapItem::icon_center_y},
                {"portIdx", &store::EmapItem::port}};

}  // namespace

Json::Value ToJson(const std::vector<store::EmapItem>& items) {
    Json::Value list(Json::arrayValue);
    for (const store::EmapItem& item : items) {
        Json::Value& json = list.append(Json::objectValue);
        json["type"] = static_cast<int>(item.type);
        json["name"] = item.name;
        for (const auto& number : kNumbers) {
            json[number.name] = item.*number.member;
        }
    }
    return list;
}

std::vector<store::EmapItem> ItemsFromJson(const Json::Value& list) {
    if (!list.isArray()) {
        throw store::InvalidRecord("the items of an e-map are a list");
    }
    std::vector<store::EmapItem> items;
    for (const Json::Value& json : list) {
        if (!json.isObject() || !json["type"].isInt() || !(json["name"].isNull() || json["name"].isString())) {
            throw store::InvalidRecord("an e-map item is an object with a number \"type\" and a text \"name\"");
        }
        store::EmapItem item;
        item.type = static_cast<store::EmapItemType>(json["type"].asInt());
        item.name = json["name"].asString();
        for (const auto& number : kNumbers) {
            const Json::Value& value = json[number.name];
            if (!value.isNull() && !value.isInt()) {
                throw store::InvalidRecord(std::string("an e-map item's \"") + number.name + "\" is a whole number");
            }
            if (!value.isNull()) {
                item.*number.member = value.asInt();
            }
        }
        items.push_back(item);
    }
    return items;
}

}  // namespace lookhaven::emap
