// SPDX-License-Identifier: Apache-2.0
//
// Writes the cameras' recording states to the file for the operator, in a thread of its own.
//
// Why so        A slow disk must not hold up the supervisor, which tells viewers every second that the recorder is alive.
// Thread safety Any thread.
#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/maintenance/recording_status.h"

namespace lookhaven::recorder {

class RecordingReport {
  public:
    // Starts the thread, which takes no signals. The installation must outlive this object. Throws std::system_error
    // when no thread can be started.
    explicit RecordingReport(const base::Installation& installation);

    // Has the thread write the states where they differ from the last; does not wait.
    void Publish(std::vector<maintenance::RecordingStatus> states);

    // Lets the thread write what was published, then ends it; does not wait.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    using States = std::vector<maintenance::RecordingStatus>;

    void Run(const std::stop_token& stop);
    bool TryToWrite(const States& states) noexcept;

    const base::Installation& installation_;
    std::mutex mutex_;
    std::condition_variable_any published_;
    std::optional<States> next_;
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
