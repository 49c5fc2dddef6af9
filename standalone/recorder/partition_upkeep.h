// SPDX-License-Identifier: Apache-2.0
//
// Has PostgreSQL's partitions of events and marks made and dropped, each hour. Does nothing for SQLite.
#pragma once

#include <atomic>
#include <cstdint>
#include <optional>
#include <string>

#include "standalone/recorder/store_thread.h"

namespace lookhaven::recorder {

class PartitionUpkeep {
  public:
    // Begins at once, in a thread of its own. Throws std::system_error when no thread can be started.
    explicit PartitionUpkeep(const std::string& store_url);

    // Call it each second; does not wait. What fails is tried again after ten minutes: who waits for a table that
    // somebody else has locked holds up all who come after.
    void Ask();

    // As in StoreThread.
    void RequestStop();
    bool HasEnded() const { return !thread_ || thread_->HasEnded(); }

  private:
    std::atomic<std::int64_t> next_us_;  // CLOCK_MONOTONIC
    std::optional<StoreThread> thread_;  // none for SQLite; last: it uses the other
};

}  // namespace lookhaven::recorder
