// SPDX-License-Identifier: Apache-2.0
//
// A process's identity in one word, so that owning something in shared memory is one atomic store.
#pragma once

#include <cstdint>

#include "standalone/base/process.h"

namespace lookhaven::ring {

// Linux gives process ids below 2^22; 42 bits of clock ticks last for a thousand years of uptime. Never 0.
constexpr std::uint64_t ProcessWord(const base::ProcessIdentity& process) {
    return (process.start_ticks << 22) | (static_cast<std::uint64_t>(process.pid) & 0x3fffff);
}

constexpr base::ProcessIdentity ProcessOf(std::uint64_t word) {
    return {static_cast<std::int32_t>(word & 0x3fffff), word >> 22};
}

// The calling process's word, cached between calls and read again in a forked child.
std::uint64_t OwnWord();

inline bool IsWordAlive(std::uint64_t word) {
    return word != 0 && base::IsAlive(ProcessOf(word));
}

}  // namespace lookhaven::ring
