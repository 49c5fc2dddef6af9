// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/clock.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>

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

std::string BootId() {
    const char* told = std::getenv("LOOKHAVEN_BOOT_ID");
    std::string boot = told != nullptr ? told : ReadFile("/proc/sys/kernel/random/boot_id");
    std::erase_if(boot, [](char letter) { return letter == '-' || letter == '\n'; });
    return boot;
}

BootTime TimeSinceBoot() {
    return {BootId(), Micros(CLOCK_BOOTTIME) / 1'000'000};
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
