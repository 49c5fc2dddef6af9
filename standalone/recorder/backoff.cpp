// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/backoff.h"

#include <algorithm>
#include <utility>

namespace lookhaven::recorder {

std::chrono::milliseconds Backoff::AfterFailure(std::chrono::milliseconds flowed) {
    if (flowed >= kStable) {
        step_ = kFirst;
    }
    const auto longest = std::exchange(step_, std::min(step_ * 2, kLast)).count();
    return std::chrono::milliseconds(std::uniform_int_distribution(longest / 2, longest)(random_));
}

}  // namespace lookhaven::recorder
