// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recording_worker.h"

#include <algorithm>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kTickUs = 250'000;

}  // namespace

RecordingWorker::RecordingWorker(int camera, RecorderContext context, control::FlushRequests& flush_requests)
    : camera_(camera),
      context_(std::move(context)),
      flush_requests_(flush_requests),
      queue_(std::make_shared<FrameQueue>(kQueueBytes)),
      written_us_(base::MonotonicMicros()) {
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void RecordingWorker::SetRequest(const RecordingRequest& request) {
    const std::lock_guard lock(mutex_);
    new_request_ = request;
    camera_name_ = request.plan.camera_name;
}

void RecordingWorker::Flush(int event) {
    asked_flush_ = event;
    queue_->Wake();
}

maintenance::CameraStatus RecordingWorker::State() const {
    const std::lock_guard lock(mutex_);
    return {camera_, state_, open_event_, queue_->Dropped().frames, camera_name_};
}

void RecordingWorker::Run(const std::stop_token& stop) {
    base::SetLogCamera(camera_);
    {
        const std::stop_callback wake(stop, [this] { queue_->Wake(); });
        EventSegmenter segmenter(camera_, context_);
        Record(segmenter, stop);
        while (std::optional<Frame> frame = queue_->Pop(0)) {
            segmenter.Take(std::move(*frame));
        }
    }
    context_.rows.NoteEnded(camera_);
    open_event_ = 0;
    has_ended_ = true;
}

void RecordingWorker::Record(EventSegmenter& segmenter, const std::stop_token& stop) {
    while (!stop.stop_requested()) {
        const std::int64_t now_us = base::MonotonicMicros();
        std::optional<Frame> frame = queue_->Pop(asked_flush_ != 0 ? now_us : now_us + kTickUs);
        {
            const std::lock_guard lock(mutex_);
            if (new_request_) {
                segmenter.SetRequest(*std::exchange(new_request_, std::nullopt));
            }
        }
        // Frames come in the order of capture.
        const std::int64_t taken_us = frame ? std::min(frame->timestamp_us, now_us) : now_us;
        if (frame) {
            segmenter.Take(std::move(*frame));
        }
        segmenter.Tick();
        written_us_ = taken_us;
        const std::int64_t age_ms = (base::MonotonicMicros() - taken_us) / 1000;
        context_.rows.NoteWritten(camera_, (context_.wall_ms() - age_ms) / 1000);
        Publish(segmenter);
        if (!frame) {
            AnswerFlush(segmenter);
        }
    }
}

// Only once the queue is empty, so that every frame that arrived is included.
void RecordingWorker::AnswerFlush(EventSegmenter& segmenter) {
    if (const int event = asked_flush_.exchange(0); event != 0) {
        flush_requests_.Answer(event, segmenter.Flush(event));
    }
}

void RecordingWorker::Publish(const EventSegmenter& segmenter) {
    state_ = segmenter.State();
    open_event_ = segmenter.OpenEvent();
    const FrameQueue::Drops drops = queue_->Dropped();
    if (drops.is_dropping && !std::exchange(drops_reported_, true)) {
        base::LogWarning("camera " + std::to_string(camera_) + ": disk too slow, dropping frames");
    } else if (!drops.is_dropping && std::exchange(drops_reported_, false)) {
        base::LogWarning("camera " + std::to_string(camera_) + ": the disk keeps up again, " +
                         std::to_string(drops.frames) + " frames dropped since the start");
    }
}

}  // namespace lookhaven::recorder
