// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/clock.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <ctime>
#include <utility>

#include "standalone/base/file.h"

namespace lookhaven::base {

namespace {

std::int64_t Micros(clockid_t clock) {
    timespec now{};
    clock_gettime(clock, &now);
    return std::int64_t{now.tv_sec} * 1'000'000 + now.tv_nsec / 1000;
}

}  // namespace

std::int64_t MonotonicMicros() {
    return Micros(CLOCK_MONOTONIC);
}

std::int64_t WallMillis() {
    return Micros(CLOCK_REALTIME) / 1000;
}

std::int64_t WallSeconds() {
    return WallMillis() / 1000;
}

BootTime TimeSinceBoot() {
    std::string boot = ReadFile("/proc/sys/kernel/random/boot_id");
    boot.erase(std::min(boot.find('\n'), boot.size()));
    return {std::move(boot), Micros(CLOCK_BOOTTIME) / 1'000'000};
}

std::string FormatUtc(std::int64_t wall_millis) {
    const std::time_t seconds = static_cast<std::time_t>(wall_millis / 1000);
    std::tm parts{};
    gmtime_r(&seconds, &parts);
    std::array<char, 32> date{};
    std::strftime(date.data(), date.size(), "%Y-%m-%dT%H:%M:%S", &parts);
    std::array<char, 48> text{};
    std::snprintf(text.data(), text.size(), "%s.%03dZ", date.data(), static_cast<int>(wall_millis % 1000));
    return text.data();
}

}  // namespace lookhaven::base
