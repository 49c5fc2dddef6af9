// SPDX-License-Identifier: Apache-2.0
//
// The process beside the host that asks the store which sessions have ended elsewhere: run out, password changed,
// account denied or removed.
#pragma once

#include "standalone/api/session_filter.h"
#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::api {

// Marks the slots of ended sessions in the table, twice a second, until the process is killed; hands the host's filter
// the store's session key at first. A store that fails is tried again. Runs in a process of its own.
[[noreturn]] void WatchSessions(const base::Installation& installation, control::SlotTable& slots,
                                SessionFilter& filter);

}  // namespace lookhaven::api
