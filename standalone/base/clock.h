// SPDX-License-Identifier: Apache-2.0
//
// The clocks: durations come from the monotonic ones, dates from the wall clock.
#pragma once

#include <cstdint>
#include <string>

namespace lookhaven::base {

// Microseconds of CLOCK_MONOTONIC: comparable between processes of the machine, not across a reboot.
std::int64_t MonotonicMicros();

// Since the epoch (UTC).
std::int64_t WallMillis();
std::int64_t WallSeconds();

// 32 hexadecimal digits, the same for all processes of the machine until the next boot. A container hides /proc's id
// behind one of its own, but not in the /proc of a confined service: there LOOKHAVEN_BOOT_ID says it.
std::string BootId();

// Which nobody sets: seconds that include suspension, comparable within one boot, whose id goes along.
struct BootTime {
    std::string boot;
    std::int64_t seconds = 0;
};
BootTime TimeSinceBoot();

// "2026-03-01T08:15:30.123Z"
std::string FormatUtc(std::int64_t wall_millis);

}  // namespace lookhaven::base
