// SPDX-License-Identifier: Apache-2.0
//
// 32-bit arithmetic on numbers that requests and recordings bring along: it wraps instead of overflowing.
#pragma once

#include <cstdint>

// The low 32 bits of a result that was computed in 64 bits, with their sign.
inline int Wrapped(std::int64_t value) {
    return static_cast<std::int32_t>(value);
}
