// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/camera_rates.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kMinuteUs = 60'000'000;

}  // namespace

void CameraRates::Note(const std::map<int, std::uint64_t>& received, std::int64_t now_us) {
    const auto is_gone = [&received](const auto& entry) { return !received.contains(entry.first); };
    std::erase_if(minutes_, is_gone);
    std::erase_if(bytes_per_second_, is_gone);
    for (const auto& [camera, bytes] : received) {
        Minute& minute = minutes_.try_emplace(camera, Minute{now_us, bytes}).first->second;
        const std::int64_t passed_us = now_us - minute.began_us;
        if (bytes < minute.bytes) {
            minute = {now_us, bytes};
        } else if (passed_us >= kMinuteUs) {
            if (bytes > minute.bytes) {
                const double seconds = static_cast<double>(passed_us) / 1e6;
                bytes_per_second_[camera] =
                    static_cast<std::int64_t>(static_cast<double>(bytes - minute.bytes) / seconds) + 1;
            }
            minute = {now_us, bytes};
        }
    }
}

}  // namespace lookhaven::recorder
