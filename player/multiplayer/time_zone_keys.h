// SPDX-License-Identifier: Apache-2.0
//
// The keys of the time zones that clients know, by ascending offset. No method takes one: a client aligns days to its
// zone by the start that it asks for.
#pragma once

#include <array>
#include <string>

// "utc_" and the minutes east of UTC, with "n" before minutes west of it.
extern const std::array<std::string, 43> kTimeZoneKeys;
