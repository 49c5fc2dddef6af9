// SPDX-License-Identifier: Apache-2.0
//
// Times, durations and sizes as operators read them.
#pragma once

#include <cstdint>
#include <string>

namespace lookhaven::base {

// "2026-03-01 08:15:30" in the host's time zone. UTC seconds.
std::string FormatMoment(std::int64_t moment_s);
// "1d 2h", "5m 10s", "0s": the two largest units.
std::string FormatDuration(std::int64_t duration_s);
// "1.5 GiB"
std::string FormatSize(std::int64_t size_bytes);

}  // namespace lookhaven::base
