// SPDX-License-Identifier: Apache-2.0
//
// Percentiles of measured times.
#pragma once

#include <cstdint>
#include <vector>

namespace bench {

// The value that the fraction of sorted values does not exceed; -1 when there is none.
inline std::int64_t Percentile(const std::vector<std::int64_t>& sorted, double fraction) {
    return sorted.empty() ? -1 : sorted[static_cast<std::size_t>(fraction * static_cast<double>(sorted.size() - 1))];
}

}  // namespace bench
