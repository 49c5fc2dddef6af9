// SPDX-License-Identifier: Apache-2.0
//
// Recovers a mount when a recorder begins to use it: closes what an earlier recorder left open.
#pragma once

#include <cstdint>

#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// This host's part in a shared mount; ignored for any other.
struct MountRole {
    int host = 0;
    bool is_maintainer = false;  // as in store/shared_mounts.h
};

// Finishes deletions, closes the mount's open events after their last good frame, removes rows whose file is missing,
// and imports recordings of today and yesterday that never got a row. Ignores ids from first_reserved_id on: the caller
// is recording them. Logs what it did; what is wrong with one file is logged and does not affect the others. False when
// there was something or the mount is not mounted: try again later. Throws store::StoreError, and std::system_error
// where the disk fails, which ends the pass: the files after it are as they were.
//
// Of a shared mount each host recovers what it has recorded itself: whether another one is still writing cannot be told
// from here by what its files look like. The host that maintains it also finishes deletions, and recovers what removed
// hosts have recorded.
bool Recover(store::Store& store, const store::Mount& mount, int first_reserved_id, std::int64_t now_s,
             const MountRole& role = {});

}  // namespace lookhaven::maintenance
