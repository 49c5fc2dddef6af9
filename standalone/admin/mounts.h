// SPDX-License-Identifier: Apache-2.0
//
// Changes of storage mounts.
//
// Failures      Besides what its declaration names, each throws Forbidden, Stale, UnusableFolder, store::NotFound,
//               store::InvalidRecord, store::StoreError, and std::system_error where a folder fails; nothing was
//               changed then.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/admin/retention_limits.h"
#include "standalone/store/mounts.h"

namespace lookhaven::admin {

// What is to be different; what is empty stays.
struct MountChange {
    std::optional<std::string> name = {};  // of a new mount the folder's own, where there is none
    std::optional<std::string> path = {};  // given when adding
    std::optional<std::int64_t> max_bytes = {};
    std::optional<std::int64_t> max_age_s = {};
    std::optional<bool> enabled = {};
    bool is_default = false;  // can be set, not cleared
    int own_host = 0;         // the machine's own: OwnHost of hosts.h
    bool is_shared = false;   // by the hosts; only when adding
    bool take_over = false;   // also a folder that is another mount's
    bool confirmed = false;   // also where a lower limit deletes recordings

    // Applies it to the record. Throws UnusableFolder for the path, which becomes a canonical one.
    void ApplyTo(store::Mount& mount) const;
};

// {"id", "name", "path", "enabled", "default", "shared", "limit": {"bytes", "days"}, "revision"}; a limit is null where
// there is none.
Json::Value MountRecord(const store::Mount& mount);

// These two return the record as it is then. The folder is marked as the mount's.
store::Mount AddMount(store::Store& store, const Actor& actor, const MountChange& change);
// seen: the record's revision that the actor saw; nothing for whatever it is. Throws DeletesRecordings unless
// confirmed.
store::Mount SetMount(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                      const MountChange& change);
// The files stay. forget_events: removes the rows of its recordings first, some of which may be gone when it throws
// StoreError. Throws StillNeeded for the default while there are others, for a mount that a camera's plan names, and,
// without forget_events, for one that holds recordings.
void RemoveMount(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen, bool forget_events);

}  // namespace lookhaven::admin
