// SPDX-License-Identifier: Apache-2.0
//
// The two clocks: durations come from the monotonic one, dates from the wall clock.
#pragma once

#include <cstdint>
#include <string>

namespace lookhaven::base {

// Microseconds of CLOCK_MONOTONIC: comparable between processes of the machine, not across a reboot.
std::int64_t MonotonicMicros();

// Since the epoch (UTC).
std::int64_t WallMillis();
std::int64_t WallSeconds();

// "2026-03-01T08:15:30.123Z"
std::string FormatUtc(std::int64_t wall_millis);

}  // namespace lookhaven::base
