// SPDX-License-Identifier: Apache-2.0
//
// Removes the oldest recordings of a mount so that it keeps within its age, its size and its disk.
//
// Invariants    (1) What goes is named by a row: a store that knows nothing removes nothing, and unknown files stay.
//               (2) The row goes before its file, so that no row points at nothing; what a crash leaves in between is a file
//                   without a row, which verify finds.
//               (3) Archived events, events that grow and mounts that are not there are left alone.
//               (4) A mark goes with the last of its footage.
// Thread safety One thread.
#pragma once

#include <cstdint>

#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

struct Removed {
    int events = 0;
    int marks = 0;
    std::int64_t bytes = 0;
};

// Removes what is too old and, the oldest first, what is too much: above the mount's own limit, or so much that less
// than twice the reserve of the disk is free; then three times the reserve are made free. Nothing happens on a mount
// that is not there. Throws store::StoreError, std::system_error.
Removed Retain(store::Store& store, const store::Mount& mount, std::int64_t now_s);

}  // namespace lookhaven::maintenance
