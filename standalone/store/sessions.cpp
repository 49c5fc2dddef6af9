// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/sessions.h"

#include <algorithm>
#include <unordered_set>

#include "standalone/store/connection.h"
#include "standalone/store/secret.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kSecretBytes = 32;
constexpr std::size_t kHandleBytes = 16;
constexpr std::int64_t kTouchEveryS = 60;

// SOCI binds long long, whatever std::int64_t is.
using Seconds = long long;

Seconds EndOf(const SessionLifetime& lifetime, std::int64_t created_s, std::int64_t now_s) {
    return std::min(now_s + lifetime.idle_s, created_s + lifetime.absolute_s);
}

}  // namespace

NewSession Sessions::Create(int user_id, std::int64_t now_s) {
    return Insert(user_id, nullptr, now_s);
}

NewSession Sessions::Create(const VerifiedUser& user, std::int64_t now_s) {
    return Insert(user.id, &user.password_hash, now_s);
}

NewSession Sessions::Insert(int user_id, const std::string* password_hash, std::int64_t now_s) {
    const NewSession session{RandomHex(kSecretBytes), RandomHex(kHandleBytes)};
    const std::string hash = Digest(session.secret);
    const Seconds now = now_s;
    const Seconds expires = EndOf(lifetime_, now_s, now_s);
    const int any_password = password_hash == nullptr;
    const std::string verified = password_hash == nullptr ? "" : *password_hash;
    connection_.Write([&](soci::session& sql) {
        int found = 0;
        sql << "insert into sessions (secret_hash, handle, user_id, created, last_seen, expires)"
               " select :hash, :handle, id, :created, :seen, :expires from users where id = :user"
               " and (password_hash = :verified or :any = 1) returning user_id",
            soci::use(hash, "hash"), soci::use(session.handle, "handle"), soci::use(now, "created"),
            soci::use(now, "seen"), soci::use(expires, "expires"), soci::use(user_id, "user"),
            soci::use(verified, "verified"), soci::use(any_password, "any"), soci::into(found);
        if (!sql.got_data()) {
            throw NotFound("there is no account " + std::to_string(user_id));
        }
    });
    return session;
}

std::optional<Session> Sessions::FindBySecret(std::string_view secret, std::int64_t now_s) {
    if (!IsHex(secret, 2 * kSecretBytes)) {
        return std::nullopt;
    }
    const std::string hash = Digest(secret);
    const Seconds now = now_s;
    return connection_.Read([&](soci::session& sql) -> std::optional<Session> {
        Session session;
        int privilege = 0;
        Seconds created = 0;
        Seconds last_seen = 0;
        Seconds expires = 0;
        sql << "select handle, created, last_seen, expires, users.id, name, privilege from sessions"
               " join users on users.id = user_id where secret_hash = :hash and expires > :now",
            soci::use(hash, "hash"), soci::use(now, "now"), soci::into(session.handle), soci::into(created),
            soci::into(last_seen), soci::into(expires), soci::into(session.user.id), soci::into(session.user.name),
            soci::into(privilege);
        if (!sql.got_data()) {
            return std::nullopt;
        }
        session.user.privilege = static_cast<Privilege>(privilege);
        session.created_s = created;
        session.last_seen_s = last_seen;
        session.expires_s = expires;
        return session;
    });
}

bool Sessions::Touch(const Session& session, std::int64_t now_s) {
    if (now_s < session.last_seen_s + kTouchEveryS) {
        return false;
    }
    const Seconds now = now_s;
    const Seconds expires = EndOf(lifetime_, session.created_s, now_s);
    return connection_.Write([&](soci::session& sql) {
        Seconds written = 0;
        sql << "update sessions set last_seen = :now, expires = :expires"
               " where handle = :handle and last_seen <= :due returning last_seen",
            soci::use(now, "now"), soci::use(expires, "expires"), soci::use(session.handle, "handle"),
            soci::use(now - kTouchEveryS, "due"), soci::into(written);
        return sql.got_data();
    });
}

bool Sessions::End(std::string_view handle) {
    if (!IsHex(handle, 2 * kHandleBytes)) {
        return false;
    }
    const std::string key(handle);
    return connection_.Write([&](soci::session& sql) {
        soci::statement end = (sql.prepare << "delete from sessions where handle = :handle", soci::use(key, "handle"));
        end.execute(true);
        return end.get_affected_rows() > 0;
    });
}

int Sessions::EndOfUser(int user_id) {
    return connection_.Write([&](soci::session& sql) {
        soci::statement end = (sql.prepare << "delete from sessions where user_id = :user", soci::use(user_id, "user"));
        end.execute(true);
        return static_cast<int>(end.get_affected_rows());
    });
}

std::vector<std::string> Sessions::EndedAmong(const std::vector<std::string>& handles, std::int64_t now_s) {
    if (handles.empty()) {
        return {};
    }
    const Seconds now = now_s;
    std::unordered_set<std::string> live;
    connection_.Read([&](soci::session& sql) {
        std::string handle;
        soci::statement rows = (sql.prepare << "select handle from sessions where expires > :now",
                                soci::use(now, "now"), soci::into(handle));
        rows.execute();
        while (rows.fetch()) {
            live.insert(handle);
        }
    });
    std::vector<std::string> ended;
    std::copy_if(handles.begin(), handles.end(), std::back_inserter(ended),
                 [&](const std::string& handle) { return !live.contains(handle); });
    return ended;
}

int Sessions::PurgeExpired(std::int64_t now_s) {
    const Seconds now = now_s;
    return connection_.Write([&](soci::session& sql) {
        soci::statement purge = (sql.prepare << "delete from sessions where expires <= :now", soci::use(now, "now"));
        purge.execute(true);
        return static_cast<int>(purge.get_affected_rows());
    });
}

}  // namespace lookhaven::store
