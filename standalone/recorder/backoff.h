// SPDX-License-Identifier: Apache-2.0
//
// How long to wait before a failed camera is tried again.
#pragma once

#include <chrono>
#include <cstdint>
#include <random>

namespace lookhaven::recorder {

// Each failure in a row doubles the wait, from kFirst to kLast, less up to a half by chance so that the cameras of one
// broken switch do not come back in step. A stream that flowed for kStable begins anew.
class Backoff {
  public:
    static constexpr std::chrono::milliseconds kFirst{1'000};
    static constexpr std::chrono::milliseconds kLast{30'000};
    static constexpr std::chrono::milliseconds kStable{10'000};

    explicit Backoff(std::uint32_t seed) : random_(seed) {}

    // The wait after a failure of a stream that had flowed for so long; zero when it never did.
    std::chrono::milliseconds AfterFailure(std::chrono::milliseconds flowed);

  private:
    std::minstd_rand random_;
    std::chrono::milliseconds step_ = kFirst;
};

}  // namespace lookhaven::recorder
