// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/amounts.h"

#include <cstdio>
#include <ctime>
#include <iterator>

#include "standalone/base/concat.h"

namespace lookhaven::base {

std::string FormatMoment(std::int64_t moment_s) {
    const auto time = static_cast<std::time_t>(moment_s);
    std::tm local{};
    char text[64];
    if (::localtime_r(&time, &local) == nullptr || std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &local) == 0) {
        return std::to_string(moment_s);
    }
    return text;
}

std::string FormatDuration(std::int64_t duration_s) {
    constexpr struct {
        const char* name;
        std::int64_t seconds;
    } kUnits[] = {{"d", 86400}, {"h", 3600}, {"m", 60}, {"s", 1}};
    for (std::size_t i = 0; i < std::size(kUnits); ++i) {
        const std::int64_t count = duration_s / kUnits[i].seconds;
        const std::int64_t rest =
            i + 1 < std::size(kUnits) ? duration_s % kUnits[i].seconds / kUnits[i + 1].seconds : 0;
        if (count > 0) {
            return Concat(count, kUnits[i].name) + (rest > 0 ? Concat(" ", rest, kUnits[i + 1].name) : "");
        }
    }
    return "0s";
}

std::string FormatSize(std::int64_t size_bytes) {
    constexpr const char* kUnits[] = {"B", "KiB", "MiB", "GiB", "TiB"};
    auto size = static_cast<double>(size_bytes);
    std::size_t unit = 0;
    for (; size >= 1024 && unit + 1 < std::size(kUnits); ++unit) {
        size /= 1024;
    }
    char text[32];
    std::snprintf(text, sizeof text, unit == 0 ? "%.0f %s" : "%.1f %s", size, kUnits[unit]);
    return text;
}

}  // namespace lookhaven::base
