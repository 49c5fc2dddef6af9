// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/access_tokens.h"

#include <utility>

#include "standalone/admin/change.h"
#include "standalone/store/value_names.h"

namespace lookhaven::admin {

namespace {

using store::AccessToken;
using store::AccessTokens;

AccessToken RequireToken(AccessTokens& tokens, int id) {
    std::optional<AccessToken> token = tokens.Find(id);
    if (!token) {
        throw store::NotFound("there is no access token " + std::to_string(id));
    }
    return *std::move(token);
}

}  // namespace

Json::Value TokenRecord(const AccessToken& token) {
    Json::Value json;
    json["id"] = token.id;
    json["name"] = token.name;
    json["camera"] = Json::arrayValue;
    for (const int camera : token.camera_ids) {
        json["camera"].append(camera);
    }
    json["kind"] = Json::arrayValue;
    for (const auto& [name, kind] : store::MarkKindNames()) {
        if (token.MayReport(kind)) {
            json["kind"].append(name);
        }
    }
    json["created"] = Json::Int64{token.created_s};
    json["by"] = token.creator;
    json["expires"] = token.expires_s == 0 ? Json::Value() : Json::Value(Json::Int64{token.expires_s});
    return json;
}

NewAccessToken AddAccessToken(store::Store& store, const Actor& actor, AccessToken token, std::int64_t lifetime_s,
                              std::int64_t now_s) {
    if (lifetime_s < 0 || lifetime_s > kMaxTokenLifetimeS) {
        throw store::InvalidRecord("an access token expires within 3650 days, or never");
    }
    token.created_s = now_s;
    token.creator = actor.name;
    token.expires_s = lifetime_s == 0 ? 0 : now_s + lifetime_s;
    NewAccessToken added;
    Apply(store, actor, [&] {
        AccessTokens tokens(store);
        auto [id, secret] = tokens.Add(token);
        added = {RequireToken(tokens, id), std::move(secret)};
        return Change{"token.add", Named(added.token.name, id), {}, TokenRecord(added.token)};
    });
    return added;
}

void RemoveAccessToken(store::Store& store, const Actor& actor, int id) {
    Apply(store, actor, [&] {
        AccessTokens tokens(store);
        const AccessToken token = RequireToken(tokens, id);
        tokens.Remove(id);
        return Change{"token.remove", Named(token.name, id), TokenRecord(token), {}};
    });
}

}  // namespace lookhaven::admin
