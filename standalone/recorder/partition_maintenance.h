// SPDX-License-Identifier: Apache-2.0
//
// Maintains PostgreSQL's monthly partitions (store/month_partitions.h) every hour. Every host does; they take turns.
// Nothing to do for SQLite.
#pragma once

#include <atomic>
#include <cstdint>
#include <optional>
#include <string>

#include "standalone/recorder/store_thread.h"

namespace lookhaven::recorder {

class PartitionMaintenance {
  public:
    // Begins at once, in a thread of its own. Throws std::system_error when no thread can be started.
    explicit PartitionMaintenance(const std::string& store_url);

    // Call it every second: does what is due; does not wait. Where the store cannot be opened, again in ten minutes;
    // after any other failure within a day.
    void Ask();

    // As in StoreThread.
    void RequestStop();
    bool HasEnded() const { return !thread_ || thread_->HasEnded(); }

  private:
    std::atomic<std::int64_t> next_us_;  // CLOCK_MONOTONIC
    std::int64_t interval_us_;           // until the next attempt; only the thread uses it
    std::optional<StoreThread> thread_;  // none for SQLite; last: it uses the others
};

}  // namespace lookhaven::recorder
