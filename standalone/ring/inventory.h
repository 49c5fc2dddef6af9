// SPDX-License-Identifier: Apache-2.0
//
// Lists an installation's segments and removes those that nobody writes any more.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

struct SegmentState {
    int shm_id = -1;  // as ipcs -m and ipcrm -m take it
    StreamId id;
    std::uint64_t size_bytes = 0;
    std::uint32_t layout_version = 0;
    bool has_known_layout = false;  // else only the fields above and attached are set
    bool writer_alive = false;
    std::uint64_t attached = 0;  // attachments in all processes
    std::int64_t heartbeat_age_ms = 0;
    std::uint64_t entries_written = 0;
    std::uint64_t entries_dropped = 0;
    std::uint64_t arena_bytes = 0;  // space for entries
    std::uint64_t used_bytes = 0;   // taken by the entries that readers can still find
    std::uint32_t readers = 0;
};

// The segments of the installation that still have a key; retired ones vanish with their last attachment.
std::vector<SegmentState> ListSegments(const base::Installation& installation);

// Removes the segments that a dead writer left and that nobody has attached; those with viewers stay, to be adopted.
// Call it when the recorder starts and now and then. Returns how many were removed.
std::size_t RemoveOrphans(const base::Installation& installation);

// For a recorder that stops: the segments of its writers, and of dead ones, go with their last reader, who ends.
void RetireAll(const base::Installation& installation);

}  // namespace lookhaven::ring
