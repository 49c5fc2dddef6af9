// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/groups.h"

#include <algorithm>

#include "standalone/store/connection.h"

namespace lookhaven::store {

namespace {

template <typename... Parameter>
std::vector<CameraGroup> Fetch(soci::session& sql, const std::string& condition, const Parameter&... parameters) {
    std::vector<CameraGroup> groups;
    Query<std::tuple<int, std::string, int>>(sql, kOnce,
                                             "select id, name, coalesce(camera_id, 0) from camera_groups"
                                             " left join group_cameras on group_id = id " +
                                                 condition + " order by id, camera_id",
                                             parameters...)
        .ForEach([&groups](const auto& row) {
            const auto& [id, name, camera] = row;
            if (groups.empty() || groups.back().id != id) {
                groups.push_back({id, name, {}});
            }
            if (camera != 0) {
                groups.back().camera_ids.insert(camera);
            }
        });
    return groups;
}

std::optional<CameraGroup> FindGroup(soci::session& sql, int id) {
    std::vector<CameraGroup> found = Fetch(sql, "where id = :id", id);
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

void AddCamera(soci::session& sql, int group, int camera) {
    RequireCameraRow(sql, camera);
    Execute(sql, "insert into group_cameras (group_id, camera_id) values (:group, :camera)", group, camera);
}

}  // namespace

int Groups::Add(const CameraGroup& group) {
    return connection_.Write([&](soci::session& sql) {
        const int id = NextId(sql, "group");
        RequireFreeName(sql, "camera_groups", "a camera group", id, group.name);
        Execute(sql, "insert into camera_groups (id, name) values (:id, :name)", id, group.name);
        for (const int camera : group.camera_ids) {
            AddCamera(sql, id, camera);
        }
        RaiseRevision(sql);
        return id;
    });
}

void Groups::Update(const CameraGroup& group) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        const CameraGroup before = Require(FindGroup(sql, group.id), "camera group", group.id);
        RequireFreeName(sql, "camera_groups", "a camera group", group.id, group.name);
        Execute(sql, "update camera_groups set name = :name where id = :id", group.name, group.id);
        for (const int camera : before.camera_ids) {
            if (!group.camera_ids.contains(camera)) {
                Execute(sql, "delete from group_cameras where group_id = :group and camera_id = :camera", group.id,
                        camera);
            }
        }
        if (std::ranges::includes(before.camera_ids, group.camera_ids)) {
            return;
        }
        for (const int camera : group.camera_ids) {
            if (!before.camera_ids.contains(camera)) {
                AddCamera(sql, group.id, camera);
            }
        }
        Execute(sql,
                "delete from sessions where user_id in (select user_id from denied_groups where group_id = :group)",
                group.id);
    });
}

std::vector<std::string> Groups::DeniedTo(int id) {
    return connection_.FetchAll<std::string>(
        "select name from users where id in (select user_id from denied_groups where group_id = :id) order by name",
        id);
}

void Groups::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(FindGroup(sql, id), "camera group", id);
        Execute(sql, "delete from camera_groups where id = :id", id);
    });
}

std::optional<CameraGroup> Groups::Find(int id) {
    return connection_.Read([&](soci::session& sql) { return FindGroup(sql, id); });
}

std::vector<CameraGroup> Groups::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, ""); });
}

}  // namespace lookhaven::store
