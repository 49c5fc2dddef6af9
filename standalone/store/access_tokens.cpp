// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/access_tokens.h"

#include <algorithm>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/secret.h"
#include "standalone/store/sessions.h"

namespace lookhaven::store {

template <>
struct Mapping<AccessToken> {
    static constexpr const char* kTable = "access_tokens";
    static constexpr const char* kColumns = "id, name, may_alert, may_pos, created_s, creator, last_use_s, expires_s";
    static auto Members(auto& token) {
        return std::tie(token.id, token.name, token.may_alert, token.may_pos, token.created_s, token.creator,
                        token.last_use_s, token.expires_s);
    }
};

namespace {

constexpr std::size_t kHandleDigits = 16;  // the rest of the random ones are known to the device alone
constexpr std::int64_t kTouchEveryS = 60;

std::string HandleOf(std::string_view secret) {
    return std::string(secret.substr(AccessTokens::kPrefix.size(), kHandleDigits));
}

template <typename... Parameter>
std::vector<AccessToken> Fetch(soci::session& sql, const std::string& condition, const Parameter&... parameters) {
    auto tokens = FetchAll<AccessToken>(sql, condition, parameters...);
    for (AccessToken& token : tokens) {
        token.camera_ids = FetchAll<int, std::set<int>>(
            sql, "select camera_id from access_token_cameras where token_id = :token", token.id);
    }
    return tokens;
}

void RequireToken(const AccessToken& token) {
    if (token.camera_ids.empty()) {
        throw InvalidRecord("an access token is for one camera at least");
    }
    if (!token.may_alert && !token.may_pos) {
        throw InvalidRecord("an access token is for alerts, POS transactions or both");
    }
}

}  // namespace

AccessTokens::Added AccessTokens::Add(const AccessToken& token) {
    RequireToken(token);
    return connection_.Write([&](soci::session& sql) {
        const Added added{NextId(sql, "token"), std::string(kPrefix) + NewSecret(Sessions(store_).Key())};
        RequireFreeName(sql, "access_tokens", "an access token", added.id, token.name);
        if (FetchOne<int>(sql, "select count(*) from access_tokens") >= kMaxTokens) {
            throw InvalidRecord("there are at most " + std::to_string(kMaxTokens) + " access tokens");
        }
        Execute(sql,
                "insert into access_tokens (id, name, may_alert, may_pos, created_s, creator, last_use_s, expires_s,"
                " handle, secret_hash) values (:id, :name, :alert, :pos, :created, :creator, 0, :expires, :handle,"
                " :hash)",
                added.id, token.name, token.may_alert, token.may_pos, token.created_s, token.creator, token.expires_s,
                HandleOf(added.secret), Digest(added.secret));
        for (const int camera : token.camera_ids) {
            RequireCameraRow(sql, camera);
            Execute(sql, "insert into access_token_cameras (token_id, camera_id) values (:token, :camera)", added.id,
                    camera);
        }
        return added;
    });
}

void AccessTokens::Remove(int id) {
    if (connection_.Execute("delete from access_tokens where id = :id", id) == 0) {
        ThrowNotFound("access token", id);
    }
}

std::optional<AccessToken> AccessTokens::FindBySecret(std::string_view secret) {
    if (!secret.starts_with(kPrefix) || !Sessions::MayBeSecret(secret.substr(kPrefix.size()))) {
        return std::nullopt;
    }
    const auto found = connection_.FetchOne<std::pair<int, std::string>>(
        "select id, secret_hash from access_tokens where handle = :handle", HandleOf(secret));
    return found && DigestMatches(found->second, secret) ? Find(found->first) : std::nullopt;
}

bool AccessTokens::WasGiven(std::string_view secret) {
    return secret.starts_with(kPrefix) && Sessions::MayBeSecret(secret.substr(kPrefix.size()), Sessions(store_).Key());
}

std::optional<AccessToken> AccessTokens::Find(int id) {
    std::vector<AccessToken> found =
        connection_.Read([id](soci::session& sql) { return Fetch(sql, "where id = :id", id); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<AccessToken> AccessTokens::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, "order by id"); });
}

void AccessTokens::Touch(const AccessToken& token, std::int64_t now_s) {
    if (now_s >= token.last_use_s && now_s < token.last_use_s + kTouchEveryS) {
        return;
    }
    connection_.Write(
        [&](soci::session& sql) {
            Execute(sql, "update access_tokens set last_use_s = :now where id = :id", now_s, token.id);
        },
        Durability::kLazy, LockWait::kNone);
}

}  // namespace lookhaven::store
