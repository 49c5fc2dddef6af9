// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/mount_forecast.h"

#include <algorithm>

namespace lookhaven::admin {

namespace {

constexpr double kSecondsPerDay = 86'400;
constexpr std::int64_t kMinSpanS = 3'600;

// What retention keeps free: it begins below twice the reserve.
constexpr std::int64_t kReserves = 2;

void KeepMin(std::optional<double>& least, double value) {
    least = std::min(least.value_or(value), value);
}

}  // namespace

std::optional<double> DaysUntilDeleted(const MountFigures& figures) {
    std::optional<double> room_bytes;
    if (figures.is_there) {
        const std::int64_t left_bytes = figures.free_bytes - kReserves * figures.reserve_bytes;
        KeepMin(room_bytes, static_cast<double>(std::max<std::int64_t>(figures.used_bytes + left_bytes, 0)));
    }
    if (figures.max_bytes > 0) {
        KeepMin(room_bytes, static_cast<double>(figures.max_bytes));
    }
    std::optional<double> days;
    if (room_bytes && figures.bytes_per_day > 0) {
        KeepMin(days, *room_bytes / figures.bytes_per_day);
    }
    if (figures.max_age_s > 0) {
        KeepMin(days, static_cast<double>(figures.max_age_s) / kSecondsPerDay);
    }
    return days;
}

double BytesPerDay(std::int64_t size_bytes, std::int64_t first_s, std::int64_t window_s, std::int64_t now_s) {
    const std::int64_t span_s = std::clamp(now_s - first_s, kMinSpanS, std::max(window_s, kMinSpanS));
    return static_cast<double>(size_bytes) * kSecondsPerDay / static_cast<double>(span_s);
}

}  // namespace lookhaven::admin
