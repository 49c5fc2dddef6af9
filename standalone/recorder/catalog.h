// SPDX-License-Identifier: Apache-2.0
//
// The streams that could run: enabled cameras and their profiles, as the store has them.
//
// Why so        A live stream must outlast the store: while that is away, the catalog keeps what it read last. And a
//               store that hangs must hold up nobody, so a thread of its own reads it.
// Thread safety One thread uses it, beside its own.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <thread>

#include "standalone/recorder/stream_worker.h"
#include "standalone/store/store.h"

namespace lookhaven::recorder {

class Catalog {
  public:
    using Streams = std::map<ring::LiveStream, StreamPlan>;

    // Starts the thread, which begins to read at once and calls on_change after it found something new. Throws
    // std::system_error when there is no thread to be had.
    Catalog(std::string store_url, std::function<void()> on_change);

    // Asks for the cameras to be read anew where the store says that something changed; does not wait. A store that
    // cannot be read is logged once and opened again at the next call.
    void Refresh();

    // What was read last, never null.
    std::shared_ptr<const Streams> Current() const;

    // Asks the thread to end and does not wait for it: the store may keep it.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    void TryToRead() noexcept;
    void Read();

    const std::string store_url_;
    const std::function<void()> on_change_;

    // The thread's alone.
    std::optional<store::Store> store_;
    std::optional<std::int64_t> revision_;
    std::string reported_failure_;

    mutable std::mutex mutex_;
    std::condition_variable_any asked_;
    bool is_asked_ = true;
    std::shared_ptr<const Streams> current_ = std::make_shared<Streams>();
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
