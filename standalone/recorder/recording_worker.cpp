// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recording_worker.h"

#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kTickUs = 250'000;

}  // namespace

RecordingWorker::RecordingWorker(int camera, RecordingSurroundings surroundings, control::FlushRequests& flush_requests)
    : camera_(camera),
      surroundings_(std::move(surroundings)),
      flush_requests_(flush_requests),
      queue_(std::make_shared<FrameQueue>(kQueueBytes)) {
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void RecordingWorker::SetOrder(const RecordingOrder& order) {
    const std::lock_guard lock(mutex_);
    new_order_ = order;
    camera_name_ = order.plan.camera_name;
}

void RecordingWorker::Flush(int event) {
    asked_flush_ = event;
    queue_->Wake();
}

maintenance::CameraRecordingState RecordingWorker::State() const {
    const std::lock_guard lock(mutex_);
    return {camera_, state_, open_event_, queue_->LostFrames().frames, camera_name_};
}

void RecordingWorker::Run(const std::stop_token& stop) {
    {
        const std::stop_callback wake(stop, [this] { queue_->Wake(); });
        CameraRecording recording(camera_, surroundings_);
        Record(recording, stop);
        while (std::optional<Frame> frame = queue_->Pop(0)) {
            recording.Take(std::move(*frame));
        }
    }
    open_event_ = 0;
    has_ended_ = true;
}

void RecordingWorker::Record(CameraRecording& recording, const std::stop_token& stop) {
    while (!stop.stop_requested()) {
        const std::int64_t now_us = base::MonotonicMicros();
        std::optional<Frame> frame = queue_->Pop(asked_flush_ != 0 ? now_us : now_us + kTickUs);
        {
            const std::lock_guard lock(mutex_);
            if (new_order_) {
                recording.SetOrder(*std::exchange(new_order_, std::nullopt));
            }
        }
        if (frame) {
            recording.Take(std::move(*frame));
        }
        recording.Tick();
        Publish(recording);
        if (!frame) {
            AnswerFlush(recording);
        }
    }
}

// Once the queue is empty, so that all that came is in.
void RecordingWorker::AnswerFlush(CameraRecording& recording) {
    if (const int event = asked_flush_.exchange(0); event != 0) {
        flush_requests_.Answer(event, recording.Flush(event));
    }
}

void RecordingWorker::Publish(const CameraRecording& recording) {
    state_ = recording.State();
    open_event_ = recording.OpenEvent();
    const FrameQueue::Losses losses = queue_->LostFrames();
    if (losses.now && !std::exchange(losses_reported_, true)) {
        base::LogWarning("camera " + std::to_string(camera_) + ": the disk does not follow, frames are left out");
    } else if (!losses.now && std::exchange(losses_reported_, false)) {
        base::LogWarning("camera " + std::to_string(camera_) + ": the disk follows again, " +
                         std::to_string(losses.frames) + " frames were left out since the start");
    }
}

}  // namespace lookhaven::recorder
