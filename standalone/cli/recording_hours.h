// SPDX-License-Identifier: Apache-2.0
//
// The hours of a recording plan as operators write and read them.
#pragma once

#include <string>

namespace lookhaven::cli {

// hours: as in store::RecordingPlan, all of them.
//
// Sets the hours of "mon-fri 8-18 always", "sat 0-24 alarm" or "never", whose days and times of day may be left out. A
// span of days or of hours may go past its end: "fri-mon 22-6". Throws Failure for another form.
void SetHours(std::string& hours, const std::string& span);

// A line for each day.
std::string HoursText(const std::string& hours);

}  // namespace lookhaven::cli
