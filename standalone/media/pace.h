// SPDX-License-Identifier: Apache-2.0
//
// Maps the times of a source to the machine's monotonic clock, and waits for them.
#pragma once

#include <cstdint>
#include <optional>
#include <stop_token>

namespace lookhaven::media {

// Waits until base::MonotonicMicros reaches due_us; false when stop was requested first.
bool SleepUntil(std::int64_t due_us, const std::stop_token& stop);

// Maps a source's own time to ours: the first frame counts as captured when it arrives, the others keep the source's
// distances. When the result is more than a second from the arrival, because the source's clock drifts, the mapping
// starts again from the arrival of the next key frame, where a recording can begin anew; when it is more than five
// seconds from it, because that clock jumped, from this arrival. Times go back at a key frame only.
class Timeline {
  public:
    std::int64_t Map(std::int64_t source_us, std::int64_t arrival_us, bool key_frame = false);

  private:
    std::optional<std::int64_t> offset_us_;
    std::int64_t newest_us_ = 0;  // that Map has given
};

}  // namespace lookhaven::media
