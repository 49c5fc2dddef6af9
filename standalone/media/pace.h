// SPDX-License-Identifier: Apache-2.0
//
// Brings the time of a source onto the machine's monotonic clock.
#pragma once

#include <cstdint>
#include <optional>
#include <stop_token>

namespace lookhaven::media {

// Waits until base::MonotonicMicros reaches the time; false when stop was requested first.
bool SleepUntil(std::int64_t due_us, const std::stop_token& stop);

// Maps a source's own time to ours: the first frame is captured when it arrives, the others as far apart as the source
// says. A source whose clock jumps or runs off by more than a second starts anew from the arrival.
class Timeline {
  public:
    std::int64_t Map(std::int64_t source_us, std::int64_t arrival_us);

  private:
    std::optional<std::int64_t> offset_us_;
};

}  // namespace lookhaven::media
