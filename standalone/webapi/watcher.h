// SPDX-License-Identifier: Apache-2.0
//
// The process beside the host that asks the store which sessions have ended elsewhere: run out, password changed,
// account denied or removed.
#pragma once

#include "standalone/base/installation.h"
#include "standalone/webapi/slot_table.h"

namespace lookhaven::webapi {

// Marks the slots of ended sessions in the table, twice a second, until the process is killed. A store that fails is
// tried again. Call it after LeaveHost.
[[noreturn]] void RunWatcher(const base::Installation& installation, SlotTable& slots);

}  // namespace lookhaven::webapi
