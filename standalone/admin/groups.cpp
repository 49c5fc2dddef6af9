// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/groups.h"

#include "standalone/admin/change.h"

namespace lookhaven::admin {

namespace {

using store::CameraGroup;
using store::Groups;

CameraGroup RequireGroup(Groups& groups, int id) {
    std::optional<CameraGroup> group = groups.Find(id);
    if (!group) {
        throw store::NotFound("there is no camera group " + std::to_string(id));
    }
    return *std::move(group);
}

}  // namespace

Json::Value GroupRecord(store::Store& store, const CameraGroup& group) {
    Json::Value json;
    json["id"] = group.id;
    json["name"] = group.name;
    json["camera"] = Json::arrayValue;
    for (const int camera : group.camera_ids) {
        json["camera"].append(camera);
    }
    json["deniedTo"] = Json::arrayValue;
    for (const std::string& account : Groups(store).DeniedTo(group.id)) {
        json["deniedTo"].append(account);
    }
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

CameraGroup AddGroup(store::Store& store, const Actor& actor, const CameraGroup& group) {
    CameraGroup added = group;
    Apply(store, actor, [&] {
        added.id = Groups(store).Add(group);
        return Change{"group.add", Named(added.name, added.id), {}, GroupRecord(store, added)};
    });
    return added;
}

CameraGroup SetGroup(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                     const std::function<void(CameraGroup&)>& edit) {
    CameraGroup group;
    Apply(store, actor, [&] {
        Groups groups(store);
        const CameraGroup before = RequireGroup(groups, id);
        const Json::Value record = GroupRecord(store, before);
        RequireCurrent(record, seen);
        group = before;
        edit(group);
        groups.Update(group);
        return Change{"group.set", Named(group.name, id), record, GroupRecord(store, group)};
    });
    return group;
}

void RemoveGroup(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen) {
    Apply(store, actor, [&] {
        Groups groups(store);
        const CameraGroup group = RequireGroup(groups, id);
        const Json::Value before = GroupRecord(store, group);
        RequireCurrent(before, seen);
        groups.Remove(id);
        return Change{"group.remove", Named(group.name, id), before, {}};
    });
}

}  // namespace lookhaven::admin
