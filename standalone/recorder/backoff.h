// SPDX-License-Identifier: Apache-2.0
//
// How long to wait before a failed camera is tried again.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <random>

namespace lookhaven::recorder {

// Each failure in a row doubles the wait, from kFirst to kLast, less up to a half by chance so that the cameras of one
// broken switch do not come back in step. A stream whose
// pictures flowed for kStable begins anew; silence after the last of them does not count.
class Backoff {
  public:
    static constexpr std::chrono::milliseconds kFirst{1'000};
    static constexpr std::chrono::milliseconds kLast{30'000};
    static constexpr std::chrono::milliseconds kStable{10'000};

    explicit Backoff(std::uint32_t seed) : random_(seed) {}

    // A picture came at that time of base::MonotonicMicros.
    void NotePicture(std::int64_t now_us);

    // The wait after a failure.
    std::chrono::milliseconds AfterFailure();

  private:
    std::minstd_rand random_;
    std::chrono::milliseconds step_ = kFirst;
    std::optional<std::int64_t> first_picture_us_;  // since the last failure
    std::int64_t last_picture_us_ = 0;
};

}  // namespace lookhaven::recorder
