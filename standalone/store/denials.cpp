// SPDX-License-Identifier: Apache-2.0
//
// What is denied to an account; users.cpp has the rest of Users.
#include <algorithm>

#include "standalone/store/connection.h"
#include "standalone/store/user_row.h"
#include "standalone/store/users.h"

namespace lookhaven::store {

namespace {

// Where a denial is stored.
struct DenialTable {
    const char* name;
    const char* columns;  // whose, of what, which kind
};

constexpr DenialTable kDeniedCameras = {"denied_cameras", "(user_id, camera_id, access)"};
constexpr DenialTable kDeniedGroups = {"denied_groups", "(user_id, group_id, access)"};
constexpr DenialTable kDeniedItems = {"denied_items", "(user_id, item_id, kind)"};

constexpr const char* kDenial = "(:user, :subject, :kind)";

// Kinds: a list of CameraAccess or DeniableItem.
template <typename Kinds>
void DenyRows(soci::session& sql, const DenialTable& table, int user, int subject, const Kinds& kinds) {
    RequireUser(sql, user);
    for (const auto kind : kinds) {
        Execute(sql,
                std::string("insert into ") + table.name + " " + table.columns + " values " + kDenial +
                    " on conflict do nothing",
                user, subject, kind);
    }
    EndSessions(sql, user);
}

template <typename Kinds>
void AllowRows(soci::session& sql, const DenialTable& table, int user, int subject, const Kinds& kinds) {
    RequireUser(sql, user);
    for (const auto kind : kinds) {
        Execute(sql, std::string("delete from ") + table.name + " where " + table.columns + " = " + kDenial, user,
                subject, kind);
    }
}

// The rows of a denial table that are the user's, by kind.
template <typename Kind>
std::map<Kind, std::set<int>> FetchDenials(soci::session& sql, const std::string& columns, const std::string& table,
                                           int user) {
    std::map<Kind, std::set<int>> denied;
    Query<std::pair<Kind, int>>(sql, kOnce, "select " + columns + " from " + table + " where user_id = :user", user)
        .ForEach([&denied](const auto& row) { denied[row.first].insert(row.second); });
    return denied;
}

Denials FetchDenials(soci::session& sql, int user) {
    return {FetchDenials<CameraAccess>(sql, "access, camera_id", "denied_cameras", user),
            FetchDenials<CameraAccess>(sql, "access, group_id", "denied_groups", user),
            FetchDenials<DeniableItem>(sql, "kind, item_id", "denied_items", user)};
}

// The ids under each kind of one that the other lacks.
template <typename Kind>
std::map<Kind, std::set<int>> Without(const std::map<Kind, std::set<int>>& one,
                                      const std::map<Kind, std::set<int>>& other) {
    std::map<Kind, std::set<int>> left;
    for (const auto& [kind, ids] : one) {
        const auto found = other.find(kind);
        for (const int id : ids) {
            if (found == other.end() || !found->second.contains(id)) {
                left[kind].insert(id);
            }
        }
    }
    return left;
}

// True when something is denied that was not.
template <typename Kind>
bool ReplaceRows(soci::session& sql, const DenialTable& table, int user, const std::map<Kind, std::set<int>>& before,
                 const std::map<Kind, std::set<int>>& after) {
    const auto change = [&](const std::string& text, const std::map<Kind, std::set<int>>& rows) {
        for (const auto& [kind, ids] : rows) {
            for (const int id : ids) {
                Execute(sql, text + kDenial, user, id, kind);
            }
        }
    };
    const std::string which = std::string(table.name) + " ";
    const auto added = Without(after, before);
    change("delete from " + which + "where " + table.columns + " = ", Without(before, after));
    change("insert into " + which + table.columns + " values ", added);
    return !added.empty();
}

// The access without which there is none of that kind; the kind itself where it takes no other.
CameraAccess TakenBy(CameraAccess kind) {
    return kind == CameraAccess::kExport ? CameraAccess::kPlayback : kind;
}

void RequireGroup(soci::session& sql, int id) {
    Require(FetchOne<int>(sql, "select id from camera_groups where id = :id", id), "camera group", id);
}

}  // namespace

void Users::SetDenials(int id, const Denials& denials) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        const Denials before = FetchDenials(sql, id);
        for (const auto& [kind, groups] : Without(denials.groups, before.groups)) {
            std::ranges::for_each(groups, [&](int group) { RequireGroup(sql, group); });
        }
        const bool cameras_added = ReplaceRows(sql, kDeniedCameras, id, before.cameras, denials.cameras);
        const bool groups_added = ReplaceRows(sql, kDeniedGroups, id, before.groups, denials.groups);
        const bool items_added = ReplaceRows(sql, kDeniedItems, id, before.items, denials.items);
        if (cameras_added || groups_added || items_added) {
            EndSessions(sql, id);
        }
    });
}

void Users::Deny(int id, int camera_id, std::initializer_list<CameraAccess> kinds) {
    connection_.Write([&](soci::session& sql) { DenyRows(sql, kDeniedCameras, id, camera_id, kinds); });
}

void Users::Allow(int id, int camera_id, std::initializer_list<CameraAccess> kinds) {
    connection_.Write([&](soci::session& sql) { AllowRows(sql, kDeniedCameras, id, camera_id, kinds); });
}

void Users::DenyGroup(int id, int group_id, std::initializer_list<CameraAccess> kinds) {
    connection_.Write([&](soci::session& sql) {
        RequireGroup(sql, group_id);
        DenyRows(sql, kDeniedGroups, id, group_id, kinds);
    });
}

void Users::AllowGroup(int id, int group_id, std::initializer_list<CameraAccess> kinds) {
    connection_.Write([&](soci::session& sql) { AllowRows(sql, kDeniedGroups, id, group_id, kinds); });
}

void Users::DenyItem(int id, DeniableItem kind, int item_id) {
    connection_.Write([&](soci::session& sql) {
        DenyRows(sql, kDeniedItems, id, item_id, std::initializer_list<DeniableItem>{kind});
    });
}

void Users::AllowItem(int id, DeniableItem kind, int item_id) {
    connection_.Write([&](soci::session& sql) {
        AllowRows(sql, kDeniedItems, id, item_id, std::initializer_list<DeniableItem>{kind});
    });
}

std::set<int> Users::DeniedCameras(int id, CameraAccess kind) {
    return connection_.FetchAll<int, std::set<int>>(
        "select camera_id from denied_cameras where user_id = :user and access in (:access, :taken)"
        " union select camera_id from group_cameras join denied_groups"
        " on denied_groups.group_id = group_cameras.group_id"
        " where user_id = :member and access in (:group_access, :group_taken)",
        id, kind, TakenBy(kind), id, kind, TakenBy(kind));
}

std::set<int> Users::DeniedGroups(int id, CameraAccess kind) {
    return connection_.FetchAll<int, std::set<int>>(
        "select group_id from denied_groups where user_id = :user and access = :access", id, kind);
}

std::set<int> Users::DeniedItems(int id, DeniableItem kind) {
    return connection_.FetchAll<int, std::set<int>>(
        "select item_id from denied_items where user_id = :user and kind = :kind", id, kind);
}

Denials Users::FindDenials(int id) {
    return connection_.Read([id](soci::session& sql) { return FetchDenials(sql, id); });
}

}  // namespace lookhaven::store
