// SPDX-License-Identifier: Apache-2.0
//
// Hands the states of cameras and mounts to what writes them to files for the operator, in a thread of its own.
//
// Why so        A slow disk must not hold up the StreamSupervisor, which tells viewers every second that the recorder
//               is alive.
// Thread safety Any thread.
#pragma once

#include <atomic>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "standalone/maintenance/camera_status.h"
#include "standalone/maintenance/mount_status.h"

namespace lookhaven::recorder {

class StatusPublisher {
  public:
    struct States {
        std::vector<maintenance::CameraStatus> cameras;
        std::vector<maintenance::MountStatus> mounts;

        bool operator==(const States&) const = default;
    };

    // Starts the thread, which takes no signals and calls write. What write throws is logged, and it is called again
    // for the next states. Throws std::system_error when no thread can be started.
    explicit StatusPublisher(std::function<void(const States&)> write);

    // Has the thread write the states where they differ from the last; does not wait.
    void Publish(States states);

    // Lets the thread write what was published, then ends it; does not wait.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    bool TryToWrite(const States& states) noexcept;

    const std::function<void(const States&)> write_;
    std::mutex mutex_;
    std::condition_variable_any published_;
    std::optional<States> next_;
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
