// SPDX-License-Identifier: Apache-2.0
//
// Identifies a process for good: a process id alone is reused.
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

// The start time of the process, 0 when it does not exist (a zombie counts as gone), or kUnknownStart when it
// cannot be read, as when descriptors have run out.
std::uint64_t ProcessStartTicks(pid_t pid);

// The calling process; a forked child must call it again. Throws std::runtime_error when the start time cannot be read.
ProcessIdentity ThisProcess();

// False once that very process is certainly gone, so that what it holds may be released. True when in doubt.
bool IsAlive(const ProcessIdentity& process);

// UTC seconds when it started, as the wall clock is now; 0 where that is not known.
std::int64_t StartedAt(const ProcessIdentity& process);

// Whether another file has taken the place of its program since it started, as an update does. False where that cannot
// be seen.
bool IsProgramReplaced(pid_t pid);

// Lets the calling process open as many descriptors as the system ever grants it.
void RaiseDescriptorLimit();

// Closes every descriptor of the calling process from the first on.
void CloseFrom(int first);

// When memory runs out, the kernel ends this process before others that more depend on. Does nothing where /proc
// cannot be written.
void PreferAsOomVictim();

}  // namespace lookhaven::base
