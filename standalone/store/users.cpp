// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/users.h"

#include "standalone/store/connection.h"
#include "standalone/store/secret.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMinPasswordBytes = 8;
constexpr std::size_t kMaxPasswordBytes = 1024;

void RequireName(std::string_view name) {
    if (IsReservedName(name)) {
        throw InvalidRecord("the account name \"" + std::string(name) + "\" is reserved");
    }
    if (!IsAccountName(name)) {
        throw InvalidRecord(
            "an account name is 1 to 64 letters, digits, '.', '_', '-', '@', the first a letter or digit");
    }
}

void RequirePassword(std::string_view password) {
    if (password.size() < kMinPasswordBytes || password.size() > kMaxPasswordBytes) {
        throw InvalidRecord("a password has 8 to 1024 bytes");
    }
}

// Also locks the row against a concurrent removal, where there are row locks.
void RequireUser(soci::session& sql, int id) {
    int found = 0;
    sql << "update users set privilege = privilege where id = :id returning id", soci::use(id, "id"), soci::into(found);
    if (!sql.got_data()) {
        throw NotFound("there is no account " + std::to_string(id));
    }
}

void EndSessions(soci::session& sql, int user_id) {
    sql << "delete from sessions where user_id = :user", soci::use(user_id, "user");
}

// Where a denial stands.
struct DenialTable {
    const char* insert;
    const char* remove;
};

constexpr DenialTable kDeniedCameras = {
    "insert into denied_cameras (user_id, camera_id, access) values (:user, :subject, :access) on conflict do nothing",
    "delete from denied_cameras where user_id = :user and camera_id = :subject and access = :access"};
constexpr DenialTable kDeniedGroups = {
    "insert into denied_groups (user_id, group_id, access) values (:user, :subject, :access) on conflict do nothing",
    "delete from denied_groups where user_id = :user and group_id = :subject and access = :access"};

constexpr DenialTable kDeniedItems = {
    "insert into denied_items (user_id, item_id, kind) values (:user, :subject, :access) on conflict do nothing",
    "delete from denied_items where user_id = :user and item_id = :subject and kind = :access"};

// Kinds: a list of CameraAccess or DeniableItem.
template <typename Kinds>
void ForEachKind(soci::session& sql, const char* statement, int user, int subject, const Kinds& kinds) {
    for (const auto kind : kinds) {
        const int access = static_cast<int>(kind);
        sql << statement, soci::use(user, "user"), soci::use(subject, "subject"), soci::use(access, "access");
    }
}

template <typename Kinds>
void DenyRows(soci::session& sql, const DenialTable& table, int user, int subject, const Kinds& kinds) {
    RequireUser(sql, user);
    ForEachKind(sql, table.insert, user, subject, kinds);
    EndSessions(sql, user);
}

template <typename Kinds>
void AllowRows(soci::session& sql, const DenialTable& table, int user, int subject, const Kinds& kinds) {
    RequireUser(sql, user);
    ForEachKind(sql, table.remove, user, subject, kinds);
}

std::set<int> DeniedIds(soci::session& sql, const char* query, int user, int access) {
    std::set<int> ids;
    int id = 0;
    soci::statement rows = (sql.prepare << query, soci::use(user, "user"), soci::use(access, "access"), soci::into(id));
    rows.execute();
    while (rows.fetch()) {
        ids.insert(id);
    }
    return ids;
}

std::optional<User> FetchOne(soci::session& sql, const std::string& condition, auto value) {
    User user;
    int privilege = 0;
    sql << "select id, name, privilege from users where " + condition, soci::use(value, "value"), soci::into(user.id),
        soci::into(user.name), soci::into(privilege);
    user.privilege = static_cast<Privilege>(privilege);
    return sql.got_data() ? std::optional(user) : std::nullopt;
}

}  // namespace

User Users::Add(std::string_view name, std::string_view password, Privilege privilege) {
    RequireName(name);
    RequirePassword(password);
    const std::string hash = HashPassword(password);
    return connection_.Write([&](soci::session& sql) {
        User user{NextId(sql, "user"), std::string(name), privilege};
        if (FetchOne(sql, "lower(name) = lower(:value)", user.name)) {
            throw AlreadyExists("there is already an account \"" + user.name + "\"");
        }
        const int level = static_cast<int>(privilege);
        sql << "insert into users (id, name, password_hash, privilege) values (:id, :name, :hash, :privilege)",
            soci::use(user.id, "id"), soci::use(user.name, "name"), soci::use(hash, "hash"),
            soci::use(level, "privilege");
        return user;
    });
}

std::optional<VerifiedUser> Users::CheckPassword(std::string_view name, std::string_view password) {
    const std::optional<User> user = FindByName(name);
    std::optional<std::string> hash;
    if (user) {
        connection_.Read([&](soci::session& sql) {
            std::string stored;
            sql << "select password_hash from users where id = :id", soci::use(user->id, "id"), soci::into(stored);
            if (sql.got_data()) {
                hash = stored;
            }
        });
    }
    if (!PasswordMatches(hash, password.substr(0, kMaxPasswordBytes + 1))) {
        return std::nullopt;
    }
    return VerifiedUser{*user, *hash};
}

std::optional<User> Users::Find(int id) {
    return connection_.Read([&](soci::session& sql) { return FetchOne(sql, "id = :value", id); });
}

std::optional<User> Users::FindByName(std::string_view name) {
    if (!IsAccountName(name)) {
        return std::nullopt;
    }
    return connection_.Read(
        [&](soci::session& sql) { return FetchOne(sql, "lower(name) = lower(:value)", std::string(name)); });
}

std::vector<User> Users::List() {
    return connection_.Read([](soci::session& sql) {
        std::vector<User> users;
        User user;
        int privilege = 0;
        soci::statement rows = (sql.prepare << "select id, name, privilege from users order by id", soci::into(user.id),
                                soci::into(user.name), soci::into(privilege));
        rows.execute();
        while (rows.fetch()) {
            user.privilege = static_cast<Privilege>(privilege);
            users.push_back(user);
        }
        return users;
    });
}

void Users::SetPassword(int id, std::string_view password) {
    RequirePassword(password);
    const std::string hash = HashPassword(password);
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        sql << "update users set password_hash = :hash where id = :id", soci::use(hash, "hash"), soci::use(id, "id");
        EndSessions(sql, id);
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
        int found = 0;
        sql << "select id from camera_groups where id = :id", soci::use(group_id, "id"), soci::into(found);
        if (!sql.got_data()) {
            throw NotFound("there is no camera group " + std::to_string(group_id));
        }
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

void Users::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        sql << "delete from users where id = :id", soci::use(id, "id");
    });
}

std::set<int> Users::DeniedCameras(int id, CameraAccess kind) {
    return connection_.Read([&](soci::session& sql) {
        return DeniedIds(sql,
                         "select camera_id from denied_cameras where user_id = :user and access = :access"
                         " union select camera_id from group_cameras join denied_groups"
                         " on denied_groups.group_id = group_cameras.group_id"
                         " where user_id = :user and access = :access",
                         id, static_cast<int>(kind));
    });
}

std::set<int> Users::DeniedGroups(int id, CameraAccess kind) {
    return connection_.Read([&](soci::session& sql) {
        return DeniedIds(sql, "select group_id from denied_groups where user_id = :user and access = :access", id,
                         static_cast<int>(kind));
    });
}

std::set<int> Users::DeniedItems(int id, DeniableItem kind) {
    return connection_.Read([&](soci::session& sql) {
        return DeniedIds(sql, "select item_id from denied_items where user_id = :user and kind = :access", id,
                         static_cast<int>(kind));
    });
}

}  // namespace lookhaven::store
