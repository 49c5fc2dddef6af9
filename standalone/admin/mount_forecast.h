// SPDX-License-Identifier: Apache-2.0
//
// For how many days of footage a mount has room.
#pragma once

#include <cstdint>
#include <optional>

namespace lookhaven::admin {

struct MountFigures {
    std::int64_t used_bytes = 0;     // by recordings
    std::int64_t free_bytes = 0;     // on the disk; nothing is recorded any more below the reserve
    std::int64_t reserve_bytes = 0;  // maintenance::MountSpace::ReserveBytes
    bool is_there = true;            // whether the two are known
    std::int64_t max_bytes = 0;      // the mount's limits; 0: none
    std::int64_t max_age_s = 0;
    double bytes_per_day = 0;  // recorded recently
};

// After so many days footage is deleted: the least of what the limits and the disk allow. Nothing when nothing is
// recorded and no age is limited, or when neither the disk nor a limit is known.
std::optional<double> DaysUntilDeleted(const MountFigures& figures);

// size_bytes was recorded since first_s, which lies after the start of the window. A window that has begun just now
// says little, so at least an hour counts.
double BytesPerDay(std::int64_t size_bytes, std::int64_t first_s, std::int64_t window_s, std::int64_t now_s);

}  // namespace lookhaven::admin
