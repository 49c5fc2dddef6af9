// SPDX-License-Identifier: Apache-2.0
//
// The thread that records one camera: hands its frames to the EventSegmenter, and answers requests to flush.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <stop_token>
#include <thread>

#include "standalone/control/flush_request.h"
#include "standalone/recorder/event_segmenter.h"
#include "standalone/recorder/frame_queue.h"

namespace lookhaven::recorder {

class RecordingWorker {
  public:
    // How much may wait for a slow disk: about four seconds of large Motion JPEG, more of any other codec.
    static constexpr std::size_t kQueueBytes = 32 << 20;

    // Starts the thread, which takes no signals. What is borrowed must outlive the worker. Throws std::system_error
    // when no thread can be started.
    RecordingWorker(int camera, RecorderContext context, control::FlushRequests& flush_requests);

    // Push the camera's frames here. May outlive the worker.
    const std::shared_ptr<FrameQueue>& Queue() const { return queue_; }
    void SetRequest(const RecordingRequest& request);
    // Has the thread flush the event and answer the flush request; does not wait.
    void Flush(int event);

    int OpenEvent() const { return open_event_; }
    // As the thread last published it, at most a quarter of a second old.
    maintenance::CameraStatus State() const;

    // Monotonic: all frames that had arrived by then are written or given up. Lags by half a second at most, and more
    // while the disk is slow.
    std::int64_t WrittenUs() const { return written_us_; }

    // Asks the thread to record what is queued, close the event and end; does not wait.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    void Record(EventSegmenter& segmenter, const std::stop_token& stop);
    void AnswerFlush(EventSegmenter& segmenter);
    void Publish(const EventSegmenter& segmenter);

    const int camera_;
    const RecorderContext context_;
    control::FlushRequests& flush_requests_;
    const std::shared_ptr<FrameQueue> queue_;
    mutable std::mutex mutex_;
    std::optional<RecordingRequest> new_request_;
    std::string camera_name_;
    std::atomic<int> asked_flush_ = 0;
    std::atomic<int> open_event_ = 0;
    std::atomic<maintenance::RecordingState> state_ = maintenance::RecordingState::kReady;
    std::atomic<std::int64_t> written_us_;
    bool drops_reported_ = false;  // only the thread uses it
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
