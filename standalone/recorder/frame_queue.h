// SPDX-License-Identifier: Apache-2.0
//
// Hands frames from the thread that reads a camera to the thread that records it.
//
// Why so        A disk may be slower than the camera, or stand still; the live picture must not feel it. So the queue
//               holds so many bytes and no more, and whoever puts a frame in never waits.
// Invariants    (1) What comes out is what a decoder needs: after a frame that found no room, everything is left out up to
//               the next key frame that does.
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

// What the frames of a run have in common.
struct RunFormat {
    media::StreamFormat video;
    std::optional<media::StreamFormat> audio;

    bool operator==(const RunFormat&) const = default;
};

// A packet that owns its data.
struct Frame {
    std::shared_ptr<const RunFormat> format;
    media::Medium medium = media::Medium::kVideo;
    std::vector<std::uint8_t> data;
    std::int64_t timestamp_us = 0;
    bool key_frame = false;

    // Borrows from this frame.
    media::Packet Packet() const;
};

class FrameQueue {
  public:
    explicit FrameQueue(std::size_t capacity_bytes) : capacity_bytes_(capacity_bytes) {}

    // Copies the packet into the queue, or leaves it out. audio is the format of the sound that goes with it. Never
    // waits for the other side's work.
    void Push(const media::Packet& packet, const std::optional<media::StreamFormat>& audio);

    // The oldest frame; nothing when none came until the time (base::MonotonicMicros) or Wake was called.
    std::optional<Frame> Pop(std::int64_t until_us);
    // Ends a Pop that waits, or the next one that would.
    void Wake();

    // Frames left out so far, and whether that goes on.
    struct Losses {
        std::uint64_t frames = 0;
        bool now = false;
    };
    Losses LostFrames() const;

  private:
    void SetFormat(const media::Packet& packet, const std::optional<media::StreamFormat>& audio);

    const std::size_t capacity_bytes_;
    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Frame> frames_;
    std::size_t queued_bytes_ = 0;
    std::shared_ptr<const RunFormat> format_;  // null before the first picture
    Losses losses_;
    bool woken_ = false;
};

}  // namespace lookhaven::recorder
