// SPDX-License-Identifier: Apache-2.0
//
// The names of time zones that the clients know, in order of their offset. No method takes one: a client aligns its days
// to its zone by the start that it asks for.
#pragma once

#include <array>
#include <string>

// "utc_" and the minutes east of UTC, "n" before those west of it. Built when the module is loaded.
extern const std::array<std::string, 43> kTimeZoneKeys;
