// SPDX-License-Identifier: Apache-2.0
//
// The last seconds of a stream in memory, so that an event can begin before its cause.
//
// Invariants    (1) Its first frame is a key frame.
//               (2) It holds at least the current group of pictures, unless that exceeds kCapacityBytes.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <deque>

#include "standalone/recorder/frame_queue.h"

namespace lookhaven::recorder {

class PreRecordBuffer {
  public:
    static constexpr std::size_t kCapacityBytes = 32 << 20;

    // Adds the frame and drops the oldest groups of pictures that are not needed for the last seconds or do not fit. A
    // frame of another format than the last drops everything before it.
    void Add(Frame frame, std::int64_t seconds);

    bool IsEmpty() const { return frames_.empty(); }
    const Frame& First() const { return frames_.front(); }
    // All frames, oldest first; the buffer is empty afterwards.
    std::deque<Frame> TakeAll();

  private:
    void DropFirstGroup();
    const Frame* SecondKeyFrame() const;

    std::deque<Frame> frames_;
    std::size_t bytes_ = 0;
};

}  // namespace lookhaven::recorder
