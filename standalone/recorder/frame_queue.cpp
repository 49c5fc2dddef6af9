// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/frame_queue.h"

#include <chrono>
#include <utility>

namespace lookhaven::recorder {

media::Packet Frame::Packet() const {
    return {medium, data, timestamp_us, key_frame, medium == base::Medium::kVideo ? &format->video : &*format->audio};
}

void FrameQueue::Push(const media::Packet& packet, const std::optional<media::StreamFormat>& audio) {
    const std::lock_guard lock(mutex_);
    SetFormat(packet, audio);
    const bool is_video = packet.medium == base::Medium::kVideo;
    if (!format_ || (!is_video && !format_->audio)) {
        return;
    }
    const bool fits = queued_bytes_ + packet.data.size() <= capacity_bytes_;
    drops_.is_dropping = drops_.is_dropping ? !(fits && is_video && packet.key_frame) : !fits;
    if (drops_.is_dropping) {
        drops_.frames += is_video ? 1 : 0;
        return;
    }
    frames_.push_back(
        {format_, packet.medium, {packet.data.begin(), packet.data.end()}, packet.timestamp_us, packet.key_frame});
    queued_bytes_ += packet.data.size();
    if (is_video) {  // sound, which comes twice as often, waits for the next picture
        changed_.notify_one();
    }
}

// The frames of one format share it.
void FrameQueue::SetFormat(const media::Packet& packet, const std::optional<media::StreamFormat>& audio) {
    if (packet.medium == base::Medium::kVideo &&
        (!format_ || format_->video != *packet.format || format_->audio != audio)) {
        format_ = std::make_shared<const media::MediaFormat>(media::MediaFormat{*packet.format, audio});
    }
}

std::optional<Frame> FrameQueue::Pop(std::int64_t until_us) {
    std::unique_lock lock(mutex_);
    const std::chrono::steady_clock::time_point until{std::chrono::microseconds(until_us)};
    changed_.wait_until(lock, until, [this] { return woken_ || !frames_.empty(); });
    woken_ = false;
    if (frames_.empty()) {
        return std::nullopt;
    }
    std::optional<Frame> frame(std::move(frames_.front()));
    frames_.pop_front();
    queued_bytes_ -= frame->data.size();
    return frame;
}

void FrameQueue::Wake() {
    const std::lock_guard lock(mutex_);
    woken_ = true;
    changed_.notify_one();
}

FrameQueue::Drops FrameQueue::Dropped() const {
    const std::lock_guard lock(mutex_);
    return drops_;
}

std::size_t FrameQueue::QueuedBytes() const {
    const std::lock_guard lock(mutex_);
    return queued_bytes_;
}

}  // namespace lookhaven::recorder
