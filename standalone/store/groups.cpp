// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/groups.h"

#include <algorithm>
#include <limits>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 64;

std::vector<CameraGroup> Fetch(soci::session& sql, int first, int last) {
    CameraGroup group;
    int camera = 0;
    soci::statement rows = (sql.prepare << "select id, name, coalesce(camera_id, 0) from camera_groups"
                                           " left join group_cameras on group_id = id"
                                           " where id >= :first and id <= :last order by id, camera_id",
                            soci::use(first, "first"), soci::use(last, "last"), soci::into(group.id),
                            soci::into(group.name), soci::into(camera));
    rows.execute();
    std::vector<CameraGroup> groups;
    while (rows.fetch()) {
        if (groups.empty() || groups.back().id != group.id) {
            groups.push_back(group);
        }
        if (camera != 0) {
            groups.back().camera_ids.insert(camera);
        }
    }
    return groups;
}

CameraGroup Require(soci::session& sql, int id) {
    std::vector<CameraGroup> found = Fetch(sql, id, id);
    if (found.empty()) {
        throw NotFound("there is no camera group " + std::to_string(id));
    }
    return std::move(found.front());
}

void RequireFreeName(soci::session& sql, const CameraGroup& group) {
    if (group.name.empty() || !IsPlainText(group.name, kMaxNameBytes)) {
        throw InvalidRecord("a camera group's name is 1 to 64 bytes of UTF-8 without control characters");
    }
    int found = 0;
    sql << "select id from camera_groups where name = :name and id <> :id", soci::use(group.name, "name"),
        soci::use(group.id, "id"), soci::into(found);
    if (sql.got_data()) {
        throw AlreadyExists("there is already a camera group \"" + group.name + "\"");
    }
}

void AddCamera(soci::session& sql, int group, int camera) {
    RequireCameraRow(sql, camera);
    sql << "insert into group_cameras (group_id, camera_id) values (:group, :camera)", soci::use(group, "group"),
        soci::use(camera, "camera");
}

}  // namespace

int Groups::Add(const CameraGroup& group) {
    return connection_.Write([&](soci::session& sql) {
        CameraGroup added = group;
        added.id = NextId(sql, "group");
        RequireFreeName(sql, added);
        sql << "insert into camera_groups (id, name) values (:id, :name)", soci::use(added.id, "id"),
            soci::use(added.name, "name");
        for (const int camera : added.camera_ids) {
            AddCamera(sql, added.id, camera);
        }
        RaiseRevision(sql);
        return added.id;
    });
}

void Groups::Update(const CameraGroup& group) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        const CameraGroup before = Require(sql, group.id);
        RequireFreeName(sql, group);
        sql << "update camera_groups set name = :name where id = :id", soci::use(group.name, "name"),
            soci::use(group.id, "id");
        for (const int camera : before.camera_ids) {
            if (!group.camera_ids.contains(camera)) {
                sql << "delete from group_cameras where group_id = :group and camera_id = :camera",
                    soci::use(group.id, "group"), soci::use(camera, "camera");
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
        sql << "delete from sessions where user_id in (select user_id from denied_groups where group_id = :group)",
            soci::use(group.id, "group");
    });
}

void Groups::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, id);
        sql << "delete from camera_groups where id = :id", soci::use(id, "id");
    });
}

std::optional<CameraGroup> Groups::Find(int id) {
    std::vector<CameraGroup> found = connection_.Read([&](soci::session& sql) { return Fetch(sql, id, id); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<CameraGroup> Groups::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, 1, std::numeric_limits<int>::max()); });
}

}  // namespace lookhaven::store
