// SPDX-License-Identifier: Apache-2.0
//
// Deletes a mount's oldest recordings until it is within its age limit, its size limit and the free space of its disk.
//
// Invariants    (1) Only what a row names is deleted: an empty store deletes nothing, and unknown files stay.
//               (2) The row is removed before its file, so that no row points at a missing file; a crash in between
//                   leaves a file without a row, which verify finds. A file that cannot be removed gets its row back.
//               (3) Archived and growing events and those on unmounted mounts are kept.
//               (4) A mark is removed with the last of its footage.
// Thread safety One thread.
#pragma once

#include <cstdint>

#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// What was deleted.
struct RetentionResult {
    int events = 0;
    int marks = 0;
    std::int64_t bytes = 0;
};

// Deletes events that are older than the mount's age limit. Then, the oldest first, as many as exceed its size limit,
// or as are needed to have three times the disk's reserve free once less than twice the reserve is. The result is empty
// for a mount that is not mounted. Throws store::StoreError; std::system_error for trouble with this mount, which says
// nothing about others: handle each mount by itself. The events deleted until then stay deleted.
RetentionResult EnforceRetention(store::Store& store, const store::Mount& mount, std::int64_t now_s);

}  // namespace lookhaven::maintenance
