// SPDX-License-Identifier: Apache-2.0
//
// What a process that the host has just forked does before its own work.
#pragma once

#include <chrono>
#include <functional>
#include <optional>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::host {

using Clock = std::chrono::steady_clock;

struct Child {
    pid_t pid = 0;
    base::FileDescriptor process;  // a pidfd: readable once it has ended
};

// Forks a process that does the work and ends. Nothing that the work throws unwinds into the host's code, whose
// destructors would remove the host's socket. Nothing, with a line in the log, when no process can be started; what
// names it there. Call it with all signals blocked.
std::optional<Child> StartChild(const char* what, const std::function<void()>& work);

// Makes a just forked process independent of its host: it dies with the host, keeps of the host's descriptors only 0,
// 2, what now is 1 (the given one, when not negative), the table's wake descriptor and the kept one, when not negative,
// whose number it returns; and takes signals as its host did, except that it ignores PIPE, INT, QUIT, HUP, USR1 and
// USR2.
int LeaveHost(pid_t host, control::SlotTable& slots, int standard_output, int kept = -1);

}  // namespace lookhaven::host
