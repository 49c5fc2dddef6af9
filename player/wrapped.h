// SPDX-License-Identifier: Apache-2.0
//
// 32-bit arithmetic on numbers from requests and recordings, which wraps instead of overflowing.
#pragma once

#include <cstdint>

// The low 32 bits, as a signed number, of a result computed in 64 bits.
inline int Wrapped(std::int64_t value) {
    return static_cast<std::int32_t>(value);
}
