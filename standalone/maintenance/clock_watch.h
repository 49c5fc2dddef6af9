// SPDX-License-Identifier: Apache-2.0
//
// Tells whether the wall clock can be trusted with deleting by age.
//
// Why so        A machine without a battery starts in 1970 or where it was switched off, and a wrong time server may
//               set the clock years ahead. Somebody must have the time to notice before footage is deleted for its age.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <optional>

namespace lookhaven::maintenance {

constexpr std::int64_t kMinSteadyUs = std::int64_t{3600} * 1'000'000;  // without a larger step than the next
constexpr std::int64_t kMaxTrustedStepS = 86'400;

class ClockWatch {
  public:
    // Call at least every few minutes. True once the wall clock has run for an hour of the monotonic one without a step
    // of more than a day.
    bool IsTrusted(std::int64_t monotonic_us, std::int64_t wall_s);

  private:
    std::optional<std::int64_t> offset_s_;  // of the wall clock, at the last call
    std::int64_t steady_since_us_ = 0;
};

}  // namespace lookhaven::maintenance
