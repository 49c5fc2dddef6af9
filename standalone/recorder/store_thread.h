// SPDX-License-Identifier: Apache-2.0
//
// A thread with a connection to the store, for work that must not block its callers.
//
// Why so        Live streams and recordings go on while the store is unavailable or hangs.
// Thread safety Ask, RequestStop and HasEnded from any thread; the work runs in the thread alone.
#pragma once

#include <atomic>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <thread>

#include "standalone/store/store.h"

namespace lookhaven::recorder {

class StoreThread {
  public:
    using Work = std::function<void(store::Store& store, const std::stop_token& stop)>;
    // What becomes of the connection after the work. Work that is asked for rarely closes it: a server may end a
    // connection that is idle for long.
    enum class Idle { kStaysOpen, kCloses };

    // Starts the thread, which takes no signals and does the work once. When the work or the opening of the store
    // throws, "cannot <purpose>" is logged once for each reason, and the store is opened again the next time. Throws
    // std::system_error when no thread can be started.
    StoreThread(std::string store_url, std::string purpose, Work work, Idle idle = Idle::kStaysOpen);

    // Has the thread do the work soon; requests made before it starts count as one. Does not wait.
    void Ask();

    // Lets the work that was asked for finish, then ends the thread; does not wait for that.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    void TryToWork(const std::stop_token& stop) noexcept;

    const std::string store_url_;
    const std::string purpose_;
    const Work work_;
    const Idle idle_;

    // Only the thread uses these.
    std::optional<store::Store> store_;
    std::string reported_failure_;

    std::mutex mutex_;
    std::condition_variable_any asked_;
    bool is_asked_ = true;
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
