// SPDX-License-Identifier: Apache-2.0
//
// The thread that records one camera.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <stop_token>
#include <thread>

#include "standalone/control/flush_request.h"
#include "standalone/recorder/camera_recording.h"
#include "standalone/recorder/frame_queue.h"

namespace lookhaven::recorder {

class RecordingWorker {
  public:
    // So much waits for a slow disk: four seconds of large Motion JPEG, more of anything else.
    static constexpr std::size_t kQueueBytes = 32 << 20;

    // Starts the thread, which takes no signals. What is borrowed must outlive the worker. Throws std::system_error when
    // there is no thread to be had.
    RecordingWorker(int camera, RecordingSurroundings surroundings, control::FlushRequests& flush_requests);

    // Where the camera's frames go in; may outlive the worker.
    const std::shared_ptr<FrameQueue>& Queue() const { return queue_; }
    void SetOrder(const RecordingOrder& order);
    // Flushes the event soon and answers those who asked for it.
    void Flush(int event);

    int OpenEvent() const { return open_event_; }
    // As the thread last published it.
    maintenance::CameraRecordingState State() const;

    // Asks the thread to record what is queued, close the event and end; does not wait.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    void Record(CameraRecording& recording, const std::stop_token& stop);
    void AnswerFlush(CameraRecording& recording);
    void Publish(const CameraRecording& recording);

    const int camera_;
    const RecordingSurroundings surroundings_;
    control::FlushRequests& flush_requests_;
    const std::shared_ptr<FrameQueue> queue_;
    mutable std::mutex mutex_;
    std::optional<RecordingOrder> new_order_;
    std::string camera_name_;
    std::atomic<int> asked_flush_ = 0;
    std::atomic<int> open_event_ = 0;
    std::atomic<maintenance::RecordingState> state_ = maintenance::RecordingState::kReady;
    bool losses_reported_ = false;  // the thread's alone
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
