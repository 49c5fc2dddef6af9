// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/backoff.h"

#include <algorithm>
#include <utility>

namespace lookhaven::recorder {

void Backoff::NotePicture(std::int64_t now_us) {
    first_picture_us_ = first_picture_us_.value_or(now_us);
    last_picture_us_ = now_us;
}

std::chrono::milliseconds Backoff::DelayAfterFailure() {
    if (first_picture_us_ && std::chrono::microseconds(last_picture_us_ - *first_picture_us_) >= kStable) {
        delay_ = kMinDelay;
    }
    first_picture_us_.reset();
    const auto delay = std::exchange(delay_, std::min(delay_ * 2, kMaxDelay)).count();
    return std::chrono::milliseconds(std::uniform_int_distribution(delay / 2, delay)(random_));
}

}  // namespace lookhaven::recorder
