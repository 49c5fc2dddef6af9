// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/pace.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <mutex>

namespace lookhaven::media {

namespace {

constexpr std::int64_t kMaxDriftUs = 1'000'000;
constexpr std::int64_t kJumpUs = 5'000'000;

}  // namespace

bool SleepUntil(std::int64_t due_us, const std::stop_token& stop) {
    std::mutex mutex;
    std::condition_variable_any woken;
    std::unique_lock lock(mutex);
    const std::chrono::steady_clock::time_point due{std::chrono::microseconds(due_us)};
    woken.wait_until(lock, stop, due, [] { return false; });
    return !stop.stop_requested();
}

std::int64_t Timeline::Map(std::int64_t source_us, std::int64_t arrival_us, bool key_frame) {
    const std::int64_t error_us = offset_us_ ? std::abs(source_us + *offset_us_ - arrival_us) : kJumpUs + 1;
    if (error_us > (key_frame ? kMaxDriftUs : kJumpUs)) {
        offset_us_ = (key_frame ? arrival_us : std::max(arrival_us, newest_us_)) - source_us;
        newest_us_ = source_us + *offset_us_;
    }
    newest_us_ = std::max(newest_us_, source_us + *offset_us_);
    return source_us + *offset_us_;
}

}  // namespace lookhaven::media
