// SPDX-License-Identifier: Apache-2.0
//
// Changes of accounts.
//
// Invariants    (1) Once there is an owner, there always is one. (2) Only an owner or the command line makes, changes
//               or removes an owner. (3) Nobody removes their own account.
//               (4) A change that takes a right away ends the account's sessions, as store/users.h says.
// Failures      Besides what its declaration names, each throws Forbidden, Stale, store::NotFound, store::InvalidRecord
//               and store::StoreError; nothing was changed then.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"

namespace lookhaven::admin {

// What is to be different; what is empty stays.
struct UserChange {
    std::optional<store::HashedPassword> password = {};
    std::optional<store::Privilege> privilege = {};
    std::optional<bool> may_mark = {};
    std::function<void(store::Denials&)> denials = {};  // is given those of now, and leaves what shall be denied
};

// These two return the record as it is then. change.password is given when adding.
Json::Value AddUser(store::Store& store, const Actor& actor, const std::string& name, const UserChange& change);
// seen: the record's revision that the actor saw; nothing for whatever it is. Throws StillNeeded for the last owner,
// who must stay one.
Json::Value SetUser(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                    const UserChange& change);
// Throws StillNeeded for the last owner and for the actor's own account.
void RemoveUser(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen);

// The account's live sessions, the newest first. Those of another account are for managers.
std::vector<store::Session> SessionsOf(store::Store& store, const Actor& actor, int id);

// Ends the session of that handle, or all of the account's; of all but the one to be kept. Returns how many. Every
// actor may end those of the own account.
int EndSessions(store::Store& store, const Actor& actor, int id, const std::optional<std::string>& handle,
                std::string_view kept);

// Changes the caller's own password, after the old one was checked; any account may. Ends its other sessions.
void ChangePassword(store::Store& store, const std::string& address, const store::VerifiedUser& user,
                    const store::HashedPassword& password, std::string_view kept_session);

// What the account sees of a camera.
struct VisibleCamera {
    int id = 0;
    std::string name;
    bool live = false;
    bool audio = false;
    bool playback = false;
    bool exported = false;  // its recordings, as files
};
// All cameras, those of paired hosts too, by id. Throws store::NotFound.
std::vector<VisibleCamera> CamerasAsSeenBy(store::Store& store, int user_id);

}  // namespace lookhaven::admin
