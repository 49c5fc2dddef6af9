// SPDX-License-Identifier: Apache-2.0
//
// Access tokens given out and taken back.
//
// Failures      Each throws Forbidden, store::NotFound (for an unknown camera, too), store::InvalidRecord,
//               store::AlreadyExists and store::StoreError; nothing was changed then.
#pragma once

#include <cstdint>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/access_tokens.h"

namespace lookhaven::admin {

constexpr std::int64_t kMaxTokenLifetimeS = std::int64_t{3650} * 86400;

// {"id", "name", "camera": [id], "kind": ["alert", "pos"], "created", "by", "expires"}, times in seconds, null for a
// token that does not expire.
Json::Value TokenRecord(const store::AccessToken& token);

struct NewAccessToken {
    store::AccessToken token;
    std::string secret;  // given out once, here
};
// token: its name, cameras and kinds. lifetime_s: 0 for a token that does not expire.
NewAccessToken AddAccessToken(store::Store& store, const Actor& actor, store::AccessToken token,
                              std::int64_t lifetime_s, std::int64_t now_s);
void RemoveAccessToken(store::Store& store, const Actor& actor, int id);

}  // namespace lookhaven::admin
