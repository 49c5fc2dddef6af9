// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/backoff.h"

#include <algorithm>
#include <utility>

namespace lookhaven::recorder {

void Backoff::NotePicture(std::int64_t now_us) {
    first_picture_us_ = first_picture_us_.value_or(now_us);
    last_picture_us_ = now_us;
}

std::chrono::milliseconds Backoff::AfterFailure() {
    if (first_picture_us_ && std::chrono::microseconds(last_picture_us_ - *first_picture_us_) >= kStable) {
        step_ = kFirst;
    }
    first_picture_us_.reset();
    const auto longest = std::exchange(step_, std::min(step_ * 2, kLast)).count();
    return std::chrono::milliseconds(std::uniform_int_distribution(longest / 2, longest)(random_));
}

}  // namespace lookhaven::recorder
