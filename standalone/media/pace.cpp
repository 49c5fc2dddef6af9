// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/pace.h"

#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <mutex>

namespace lookhaven::media {

namespace {

constexpr std::int64_t kToleranceUs = 1'000'000;

}  // namespace

bool SleepUntil(std::int64_t due_us, const std::stop_token& stop) {
    std::mutex mutex;
    std::condition_variable_any woken;
    std::unique_lock lock(mutex);
    const std::chrono::steady_clock::time_point due{std::chrono::microseconds(due_us)};
    woken.wait_until(lock, stop, due, [] { return false; });
    return !stop.stop_requested();
}

std::int64_t Timeline::Map(std::int64_t source_us, std::int64_t arrival_us) {
    if (!offset_us_ || std::abs(source_us + *offset_us_ - arrival_us) > kToleranceUs) {
        offset_us_ = arrival_us - source_us;
    }
    return source_us + *offset_us_;
}

}  // namespace lookhaven::media
