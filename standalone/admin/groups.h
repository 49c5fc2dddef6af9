// SPDX-License-Identifier: Apache-2.0
//
// Changes of camera groups.
//
// Failures      Each throws Forbidden, Stale, store::NotFound (for an unknown camera, too), store::InvalidRecord,
//               store::AlreadyExists and store::StoreError; nothing was changed then.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/groups.h"

namespace lookhaven::admin {

// {"id", "name", "camera": [ids], "deniedTo": [names of the accounts to which something of the group is denied],
// "revision"}. Throws store::StoreError.
Json::Value GroupRecord(store::Store& store, const store::CameraGroup& group);

// AddGroup and SetGroup return the group as stored.
store::CameraGroup AddGroup(store::Store& store, const Actor& actor, const store::CameraGroup& group);
// seen: the record's revision that the actor saw; nothing for whatever it is. edit changes the group, and what it
// throws ends the change. Added cameras end the sessions of those to whom the group is denied.
store::CameraGroup SetGroup(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                            const std::function<void(store::CameraGroup&)>& edit);
// Its cameras stay. What is denied of it to an account no longer is: the audit log has to whom it was.
void RemoveGroup(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen);

}  // namespace lookhaven::admin
