// SPDX-License-Identifier: Apache-2.0
//
// Times of day in this host's time zone.
#pragma once

#include <cstdint>

namespace lookhaven::base {

constexpr int kHoursOfWeek = 168;

// The hour of the week at that time in the host's time zone as it is set now: 0 is Monday from 00:00 to 01:00. Where
// clocks are put back an hour comes twice, and where they are put forward one is left out.
int LocalHourOfWeek(std::int64_t time_s);

}  // namespace lookhaven::base
