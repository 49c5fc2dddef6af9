// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/users.h"

#include "standalone/store/connection.h"
#include "standalone/store/secret.h"
#include "standalone/store/text.h"
#include "standalone/store/user_row.h"

namespace lookhaven::store {

template <>
struct Mapping<User> {
    static constexpr const char* kTable = "users";
    static constexpr const char* kColumns = "id, name, privilege, may_mark";
    static auto Members(auto& user) { return std::tie(user.id, user.name, user.privilege, user.may_mark_as_viewer); }
};

template <>
struct Mapping<VerifiedUser> {
    static constexpr const char* kTable = "users";
    static constexpr const char* kColumns = "id, name, privilege, may_mark, password_hash";
    static auto Members(auto& user) {
        return std::tie(user.id, user.name, user.privilege, user.may_mark_as_viewer, user.password_hash);
    }
};

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

template <typename Account>
std::optional<Account> FetchByName(Connection& connection, std::string_view name) {
    return IsAccountName(name) ? connection.FetchOne<Account>("where lower(name) = lower(:name)", std::string(name))
                               : std::nullopt;
}

}  // namespace

void RequirePassword(std::string_view password) {
    if (password.size() < kMinPasswordBytes || password.size() > kMaxPasswordBytes) {
        throw InvalidRecord("a password has 8 to 1024 bytes");
    }
}

HashedPassword::HashedPassword(std::string_view password)
    : text_((RequirePassword(password), HashPassword(password))) {}

User Users::Add(std::string_view name, std::string_view password, Privilege privilege) {
    RequireName(name);
    return Add(name, HashedPassword(password), privilege);
}

User Users::Add(std::string_view name, const HashedPassword& password, Privilege privilege) {
    RequireName(name);
    VerifiedUser user;
    user.name = name;
    user.privilege = privilege;
    user.password_hash = password.Text();
    return connection_.Write([&](soci::session& sql) -> User {
        user.id = NextId(sql, "user");
        if (Exists(sql, "select id from users where lower(name) = lower(:name)", user.name)) {
            throw AlreadyExists("there is already an account \"" + user.name + "\"");
        }
        Insert(sql, user);
        return user;
    });
}

std::optional<VerifiedUser> Users::CheckPassword(std::string_view name, std::string_view password) {
    std::optional<VerifiedUser> user = FetchByName<VerifiedUser>(connection_, name);
    const std::optional<std::string> hash = user ? std::optional(user->password_hash) : std::nullopt;
    return PasswordMatches(hash, password.substr(0, kMaxPasswordBytes + 1)) ? user : std::nullopt;
}

std::optional<User> Users::Find(int id) {
    return connection_.FetchOne<User>("where id = :id", id);
}

std::optional<User> Users::FindByName(std::string_view name) {
    return FetchByName<User>(connection_, name);
}

std::vector<User> Users::List() {
    return connection_.FetchAll<User>("order by id");
}

bool Users::IsEmpty() {
    return !connection_.FetchOne<int>("select id from users limit 1");
}

void Users::Lock() {
    connection_.Execute("update counters set value = value where name = 'user'");
}

void Users::SetPassword(int id, std::string_view password) {
    SetPassword(id, HashedPassword(password));
}

void Users::SetPassword(int id, const HashedPassword& password) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        Execute(sql, "update users set password_hash = :hash where id = :id", password.Text(), id);
        EndSessions(sql, id);
    });
}

void Users::SetPassword(const VerifiedUser& user, const HashedPassword& password, std::string_view kept_session) {
    connection_.Write([&](soci::session& sql) {
        const int changed =
            Execute(sql, "update users set password_hash = :hash where id = :id and password_hash = :verified",
                    password.Text(), user.id, user.password_hash);
        Require(changed > 0 ? std::optional(user.id) : std::nullopt, "account", user.id);
        Execute(sql, "delete from sessions where user_id = :user and handle <> :kept", user.id,
                std::string(kept_session));
    });
}

void Users::SetPrivilege(int id, Privilege privilege) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        if (Execute(sql, "update users set privilege = :privilege where id = :id and privilege < :lower", privilege, id,
                    privilege) > 0) {
            EndSessions(sql, id);
        } else {
            Execute(sql, "update users set privilege = :privilege where id = :id", privilege, id);
        }
    });
}

void Users::DenyMarks(int id) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        Execute(sql, "update users set may_mark = 0 where id = :id", id);
        EndSessions(sql, id);
    });
}

void Users::AllowMarks(int id) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        Execute(sql, "update users set may_mark = 1 where id = :id", id);
    });
}

void Users::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RequireUser(sql, id);
        Execute(sql, "delete from users where id = :id", id);
    });
}

}  // namespace lookhaven::store
