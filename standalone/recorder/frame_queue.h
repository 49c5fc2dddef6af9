// SPDX-License-Identifier: Apache-2.0
//
// Passes frames from the thread that reads a camera to the thread that records it.
//
// Why so        A disk may be slower than the camera, or hang; live view must not suffer. So the queue has a fixed
//               capacity in bytes, and Push never waits for the disk.
// Invariants    (1) What comes out can be decoded: after a frame that did not fit, everything is dropped up to the next
//               key frame that fits.
//               (2) The bytes queued never exceed the capacity.
// Thread safety Any thread.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::recorder {

// A packet that owns its data.
struct Frame {
    std::shared_ptr<const media::MediaFormat> format;
    base::Medium medium = base::Medium::kVideo;
    std::vector<std::uint8_t> data;
    std::int64_t timestamp_us = 0;
    bool key_frame = false;

    // Borrows from this frame.
    media::Packet Packet() const;
};

class FrameQueue {
  public:
    explicit FrameQueue(std::size_t capacity_bytes) : capacity_bytes_(capacity_bytes) {}

    // Copies the packet into the queue, or drops it. audio: the format of the sound that goes with the picture. Never
    // waits for the recording thread.
    void Push(const media::Packet& packet, const std::optional<media::StreamFormat>& audio);

    // The oldest frame. Where there is none it waits for a picture until until_us (base::MonotonicMicros) or Wake;
    // nothing when none came. Sound alone does not end the wait.
    std::optional<Frame> Pop(std::int64_t until_us);
    // Ends the Pop that is waiting; when none is, the next one does not wait.
    void Wake();

    // Pictures dropped so far, and whether the queue is dropping now. Sound is not counted.
    struct Drops {
        std::uint64_t frames = 0;
        bool is_dropping = false;
    };
    Drops Dropped() const;
    std::size_t QueuedBytes() const;
    std::size_t CapacityBytes() const { return capacity_bytes_; }

  private:
    void SetFormat(const media::Packet& packet, const std::optional<media::StreamFormat>& audio);

    const std::size_t capacity_bytes_;
    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Frame> frames_;
    std::size_t queued_bytes_ = 0;
    std::shared_ptr<const media::MediaFormat> format_;  // null before the first picture
    Drops drops_;
    bool woken_ = false;
};

}  // namespace lookhaven::recorder
