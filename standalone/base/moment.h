// SPDX-License-Identifier: Apache-2.0
//
// Reads dates and times of ISO 8601.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace lookhaven::base {

struct Moment {
    std::int64_t utc_s = 0;
    bool has_zone = false;  // without one the host's time zone was used
};

// "2026-03-01", "2026-03-01 08:15", "2026-03-01T08:15:30", "2026-03-01T08:15:30.250", which is cut to the second;
// behind each of them "Z", and behind a time also "+01:00" or "+0100". Nothing for another form, and for what the
// calendar lacks.
std::optional<Moment> ParseMoment(std::string text);

}  // namespace lookhaven::base
