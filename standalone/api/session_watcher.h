// SPDX-License-Identifier: Apache-2.0
//
// The process beside the host that asks the store which sessions have ended elsewhere (run out, password changed,
// account denied or removed), which pairings have, and whether something was reported, which wakes VEXO.Event Watch.
#pragma once

#include <cstdint>

#include "standalone/api/session_filter.h"
#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::api {

// When expired sessions are to be removed: every hour; after a failure in a minute, and in twice as long with each
// failure in a row. Times are of one clock, in seconds.
class PurgeSchedule {
  public:
    bool IsDue(std::int64_t now_s) const { return now_s >= due_s_; }
    void NoteAttempt(std::int64_t now_s, bool is_purged);

  private:
    std::int64_t due_s_ = 0;
    std::int64_t pause_s_ = 0;
};

// Twice a second, until the process is killed: marks the slots of ended sessions and pairings in the table, and notes
// there what was reported. Hands the host's filter the store's session key at first. A store that fails is tried again.
// Runs in a process of its own.
[[noreturn]] void WatchSessions(const base::Installation& installation, control::SlotTable& slots,
                                SessionFilter& filter);

}  // namespace lookhaven::api
