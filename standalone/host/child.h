// SPDX-License-Identifier: Apache-2.0
//
// What a process that the host has just forked does before its own work.
#pragma once

#include <functional>

#include <sys/types.h>

#include "standalone/control/slot_table.h"

namespace lookhaven::host {

// Makes a just forked process independent of its host: it dies with the host, keeps of the host's descriptors only 0,
// 2, what now is 1 (the given one, when not negative) and the table's wake descriptor, and takes signals as its host
// did, except that it ignores PIPE, INT, QUIT, HUP, USR1 and USR2. Call it with all signals blocked.
void LeaveHost(pid_t host, control::SlotTable& slots, int standard_output);

// Does the work and ends the process. Nothing that the work throws unwinds into the host's code, whose destructors
// would remove the host's socket.
[[noreturn]] void RunAndExit(const std::function<void()>& work);

}  // namespace lookhaven::host
