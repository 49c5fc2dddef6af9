// SPDX-License-Identifier: Apache-2.0
//
// Tells processes apart for as long as it matters: a process id alone is reused.
#pragma once

#include <cstdint>

#include <sys/types.h>

namespace lookhaven::base {

// A process by id and start time.
struct ProcessIdentity {
    std::int32_t pid = 0;
    std::uint64_t start_ticks = 0;  // clock ticks since boot, as the kernel keeps it

    bool operator==(const ProcessIdentity&) const = default;
};

// The start time of the process, or 0 when it does not exist (a zombie counts as gone).
std::uint64_t ProcessStartTicks(pid_t pid);

// The calling process; read anew after a fork.
ProcessIdentity ThisProcess();

// False once that very process is gone.
bool IsAlive(const ProcessIdentity& process);

}  // namespace lookhaven::base
