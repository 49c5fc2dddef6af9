// SPDX-License-Identifier: Apache-2.0
//
// How long to wait before a failed camera is tried again.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <random>

namespace lookhaven::recorder {

// The delay doubles with each consecutive failure, from kMinDelay up to kMaxDelay, and a random part of up to half of
// it is taken off, so that the cameras behind one failed switch do not all reconnect at once. It starts over at
// kMinDelay after pictures arrived for kStable or longer, measured from the first picture to the last.
class Backoff {
  public:
    static constexpr std::chrono::milliseconds kMinDelay{1'000};
    static constexpr std::chrono::milliseconds kMaxDelay{30'000};
    static constexpr std::chrono::milliseconds kStable{10'000};

    explicit Backoff(std::uint32_t seed) : random_(seed) {}

    // A picture arrived; now_us is base::MonotonicMicros.
    void NotePicture(std::int64_t now_us);

    // How long to wait after this failure. Not the upper bound: the random part is already off.
    std::chrono::milliseconds DelayAfterFailure();

  private:
    std::minstd_rand random_;
    std::chrono::milliseconds delay_ = kMinDelay;
    std::optional<std::int64_t> first_picture_us_;  // since the last failure
    std::int64_t last_picture_us_ = 0;
};

}  // namespace lookhaven::recorder
