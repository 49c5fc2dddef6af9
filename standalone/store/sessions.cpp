// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/sessions.h"

#include <algorithm>
#include <set>

#include "standalone/base/text.h"
#include "standalone/store/connection.h"
#include "standalone/store/secret.h"

namespace lookhaven::store {

template <>
struct Mapping<Session> {
    static constexpr const char* kTable = "sessions join users on users.id = user_id";
    static constexpr const char* kColumns =
        "handle, created, last_seen, expires, address, users.id, name, privilege, may_mark";
    static auto Members(auto& session) {
        return std::tie(session.handle, session.created_s, session.last_seen_s, session.expires_s, session.address,
                        session.user.id, session.user.name, session.user.privilege, session.user.may_mark_as_viewer);
    }
};

namespace {

constexpr std::size_t kHandleBytes = 16;
constexpr std::int64_t kTouchEveryS = 60;

std::int64_t EndOf(const SessionLifetime& lifetime, std::int64_t created_s, std::int64_t now_s) {
    return std::min(now_s + lifetime.idle_s, created_s + lifetime.absolute_s);
}

}  // namespace

NewSession Sessions::Create(int user_id, std::int64_t now_s, std::string_view address) {
    return Insert(user_id, nullptr, now_s, address);
}

NewSession Sessions::Create(const VerifiedUser& user, std::int64_t now_s, std::string_view address) {
    return Insert(user.id, &user.password_hash, now_s, address);
}

NewSession Sessions::Insert(int user_id, const std::string* password_hash, std::int64_t now_s,
                            std::string_view address) {
    const NewSession session{NewSecret(Key()), RandomHex(kHandleBytes)};
    const bool any_password = password_hash == nullptr;
    connection_.Write([&](soci::session& sql) {
        const auto found =
            FetchOne<int>(sql,
                          "insert into sessions (secret_hash, handle, user_id, created, last_seen, expires, address)"
                          " select :hash, :handle, id, :created, :seen, :expires, :address from users where id = :user"
                          " and (password_hash = :verified or :any = 1) returning user_id",
                          Digest(session.secret), session.handle, now_s, now_s, EndOf(lifetime_, now_s, now_s),
                          std::string(address), user_id, any_password ? std::string() : *password_hash, any_password);
        Require(found, "account", user_id);
        Execute(sql,
                "delete from sessions where user_id = :user and handle <> :new and (expires <= :now or handle not in"
                " (select handle from sessions where user_id = :owner and handle <> :newest and expires > :now_too"
                " order by created desc, handle limit :others))",
                user_id, session.handle, now_s, user_id, session.handle, now_s, kMaxPerUser - 1);
    });
    return session;
}

bool Sessions::MayBeSecret(std::string_view text) {
    return base::IsHex(text, kSecretDigits);
}

bool Sessions::MayBeSecret(std::string_view text, std::string_view key) {
    return MayBeSecret(text) && TagMatches(key, text.substr(0, kRandomDigits), text.substr(kRandomDigits));
}

std::optional<Session> Sessions::FindBySecret(std::string_view secret, std::int64_t now_s) {
    if (!MayBeSecret(secret)) {
        return std::nullopt;
    }
    return connection_.FetchOne<Session>("where secret_hash = :hash and expires > :now", Digest(secret), now_s);
}

bool Sessions::Touch(const Session& session, std::int64_t now_s) {
    const auto touch = [&](soci::session& sql) {
        return Execute(sql,
                       "update sessions set last_seen = :now, expires = :expires"
                       " where handle = :handle and last_seen <= :due",
                       now_s, EndOf(lifetime_, session.created_s, now_s), session.handle, now_s - kTouchEveryS) > 0;
    };
    return now_s >= session.last_seen_s + kTouchEveryS && connection_.Write(touch, Durability::kLazy, LockWait::kNone);
}

std::string Sessions::Key() {
    return connection_.FetchOne<std::string>("select value from settings where name = 'session_key'").value();
}

bool Sessions::End(std::string_view handle) {
    return base::IsHex(handle, 2 * kHandleBytes) &&
           connection_.Execute("delete from sessions where handle = :handle", std::string(handle)) > 0;
}

bool Sessions::End(int user_id, std::string_view handle) {
    return base::IsHex(handle, 2 * kHandleBytes) &&
           connection_.Execute("delete from sessions where user_id = :user and handle = :handle", user_id,
                               std::string(handle)) > 0;
}

int Sessions::EndOfUser(int user_id, std::string_view kept) {
    return connection_.Execute("delete from sessions where user_id = :user and handle <> :kept", user_id,
                               std::string(kept));
}

std::vector<Session> Sessions::OfUser(int user_id, std::int64_t now_s) {
    return connection_.FetchAll<Session>("where user_id = :user and expires > :now order by created desc, handle",
                                         user_id, now_s);
}

std::map<int, Sessions::Use> Sessions::Uses(std::int64_t now_s) {
    std::map<int, Use> uses;
    connection_.Read([&](soci::session& sql) {
        Query<std::tuple<int, int, std::int64_t>>(
            sql, kOnce, "select user_id, count(*), max(last_seen) from sessions where expires > :now group by user_id",
            now_s)
            .ForEach([&uses](const auto& row) {
                uses[std::get<0>(row)] = {std::get<1>(row), std::get<2>(row)};
            });
    });
    return uses;
}

std::vector<std::string> Sessions::EndedAmong(const std::vector<std::string>& handles, std::int64_t now_s) {
    if (handles.empty()) {
        return {};
    }
    const auto live = connection_.FetchAll<std::string, std::set<std::string>>(
        "select handle from sessions where expires > :now", now_s);
    std::vector<std::string> ended;
    std::ranges::copy_if(handles, std::back_inserter(ended),
                         [&live](const std::string& handle) { return !live.contains(handle); });
    return ended;
}

int Sessions::PurgeExpired(std::int64_t now_s) {
    return connection_.Write(
        [&](soci::session& sql) { return Execute(sql, "delete from sessions where expires <= :now", now_s); },
        Durability::kLazy, LockWait::kNone);
}

}  // namespace lookhaven::store
