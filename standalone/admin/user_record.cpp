// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/user_record.h"

#include <algorithm>

#include "standalone/admin/change.h"
#include "standalone/store/value_names.h"

namespace lookhaven::admin {

namespace {

using store::DeniableItem;

const base::Names<DeniableItem> kItems = {
    {"emap", DeniableItem::kEmap}, {"door", DeniableItem::kDoor}, {"ioModule", DeniableItem::kIoModule}};

// The ids under the name of each kind.
template <typename Kind>
void Put(Json::Value& json, const base::Names<Kind>& names, const std::map<Kind, std::set<int>>& denied) {
    for (const auto& [name, kind] : names) {
        Json::Value& ids = json[name] = Json::arrayValue;
        if (const auto found = denied.find(kind); found != denied.end()) {
            for (const int id : found->second) {
                ids.append(id);
            }
        }
    }
}

std::set<int> IdsFrom(const Json::Value& json, const std::string& name) {
    std::set<int> ids;
    const bool is_list = json.isNull() || (json.isArray() && std::all_of(json.begin(), json.end(), [](const auto& id) {
                                               return id.isInt() && id.asInt() > 0;
                                           }));
    if (!is_list) {
        throw store::InvalidRecord("deny." + name + " must be a list of ids");
    }
    for (const Json::Value& id : json) {
        ids.insert(id.asInt());
    }
    return ids;
}

// Takes what the names name out of the object; the rest stays.
template <typename Kind>
void Take(Json::Value& json, const base::Names<Kind>& names, const std::string& prefix,
          std::map<Kind, std::set<int>>& denied) {
    for (const auto& [name, kind] : names) {
        denied[kind] = IdsFrom(json[name], prefix + name);
        json.removeMember(name);
    }
}

void RequireObject(const Json::Value& json, const std::string& name) {
    if (!json.isObject()) {
        throw store::InvalidRecord(name + " must be an object");
    }
}

void RequireEmpty(const Json::Value& json, const std::string& name) {
    if (!json.empty()) {
        throw store::InvalidRecord(name + " has no member " + json.getMemberNames().front());
    }
}

}  // namespace

Json::Value UserRecord(store::Store& store, const store::User& user) {
    Json::Value json;
    json["id"] = user.id;
    json["name"] = user.name;
    json["privilege"] = base::NameOf(store::PrivilegeNames(), user.privilege);
    json["mayMark"] = user.MayMark();
    json["deny"] = ToJson(store::Users(store).FindDenials(user.id));
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

store::Privilege PrivilegeFrom(const std::string& name) {
    const auto found = store::PrivilegeNames().find(name);
    if (found == store::PrivilegeNames().end()) {
        throw store::InvalidRecord("privilege must be owner, manager or viewer");
    }
    return found->second;
}

Json::Value ToJson(const store::Denials& denials) {
    Json::Value json;
    Put(json, store::CameraAccessNames(), denials.cameras);
    Put(json["group"], store::CameraAccessNames(), denials.groups);
    Put(json, kItems, denials.items);
    return json;
}

store::Denials DenialsFrom(const Json::Value& json) {
    RequireObject(json, "deny");
    Json::Value rest = json;
    Json::Value group = rest.get("group", Json::objectValue);
    RequireObject(group, "deny.group");
    rest.removeMember("group");
    store::Denials denials;
    Take(rest, store::CameraAccessNames(), "", denials.cameras);
    Take(group, store::CameraAccessNames(), "group.", denials.groups);
    Take(rest, kItems, "", denials.items);
    RequireEmpty(rest, "deny");
    RequireEmpty(group, "deny.group");
    return denials;
}

}  // namespace lookhaven::admin
