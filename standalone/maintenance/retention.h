// SPDX-License-Identifier: Apache-2.0
//
// Deletes a mount's oldest recordings until it is within its age limit, its size limit and the free space of its disk,
// and those of its cameras that have a maximum age of their own until they are within that.
//
// Invariants    (1) Only what a row names is deleted: an empty store deletes nothing, and unknown files stay.
//               (2) Kept and growing events and those on unmounted mounts stay.
//               (3) The oldest is what was recorded first, not what has the earliest date: clocks have been wrong.
//               (4) A disk that stays full whatever is deleted does not cost more than what should have made room.
// Thread safety One thread.
#pragma once

#include <cstdint>

#include "standalone/maintenance/deletion.h"
#include "standalone/maintenance/space_watch.h"
#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

enum class AgeLimit { kApplies, kWaits };  // waits while the clock cannot be trusted

struct RetentionClock {
    std::int64_t now_s = 0;
    AgeLimit age_limit = AgeLimit::kWaits;
    std::int64_t monotonic_us = 0;
};

// What deleting gives back to a mount's disk; keep it from one pass to the next.
struct DiskWatch {
    SpaceWatch bytes;
    SpaceWatch files;

    bool IsHeld() const { return bytes.IsHeld() || files.IsHeld(); }
};

// Deletes events, the oldest first: those older than the mount's age limit, and as many as exceed its size limit or as
// are needed to have three times the disk's reserve free once less than twice the reserve is; for the latter no more
// than the watch allows. Before them, those older than their camera's maximum age. An event is kept while one recorded
// before it, to the mount or for a camera's age by the camera, is not old enough. Nothing happens to a mount that is
// not mounted. Throws store::StoreError; std::system_error for trouble with this mount, which says nothing about
// others: handle each mount by itself, and try again later. A file of which only the file system's rights or kinds are
// in the way keeps neither other cameras' ages nor the mount's limits from being enforced; a disk that fails ends the
// run. host: as of Deletion, which throws store::LeaseLost. deleted: gets what was deleted, also by a run that throws.
void EnforceRetention(store::Store& store, const store::Mount& mount, const RetentionClock& clock, int host,
                      DiskWatch& watch, DeletionResult& deleted);

// What the mount's own limits would have EnforceRetention delete over time, without what a full disk adds.
struct RetentionForecast {
    std::int64_t events = 0;
    std::int64_t bytes = 0;
    std::int64_t end_s = 0;  // of the youngest event
};
RetentionForecast ForecastRetention(store::Store& store, const store::Mount& mount, std::int64_t now_s);
// What that maximum age of a camera would have it delete, on all mounts.
RetentionForecast ForecastRetention(store::Store& store, int camera_id, std::int64_t max_age_s, std::int64_t now_s);

}  // namespace lookhaven::maintenance
