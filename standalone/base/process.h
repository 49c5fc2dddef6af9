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

constexpr std::uint64_t kUnknownStart = ~std::uint64_t{0};

// The start time of the process, 0 when it does not exist (a zombie counts as gone), or kUnknownStart when the system
// does not say, as when descriptors have run out.
std::uint64_t ProcessStartTicks(pid_t pid);

// The calling process; read anew after a fork. Throws std::runtime_error when its start time cannot be had.
ProcessIdentity ThisProcess();

// False once that very process is certainly gone: what it holds may be taken away then.
bool IsAlive(const ProcessIdentity& process);

// Lets the calling process open as many descriptors as the system ever grants it.
void RaiseDescriptorLimit();

}  // namespace lookhaven::base
