// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/probe.h"

namespace lookhaven::media {

namespace {

constexpr int kFramesWatched = 25;
constexpr std::int64_t kWatchUs = 1'500'000;
constexpr std::int64_t kMaxKeyFrameWatchUs = 5'000'000;

}  // namespace

ProbeResult Probe(Source& source) {
    ProbeResult result;
    result.audio = source.Audio();
    std::int64_t first_us = 0;
    for (int frames = 0;;) {
        const Packet packet = source.Next();
        if (packet.medium == Medium::kAudio) {
            continue;
        }
        if (frames++ == 0) {
            first_us = packet.timestamp_us;
        }
        result.video = *packet.format;
        if (packet.key_frame && result.key_frame.empty()) {
            result.key_frame.assign(packet.data.begin(), packet.data.end());
        }
        const std::int64_t passed_us = packet.timestamp_us - first_us;
        if (passed_us > 0) {
            result.frames_per_second = (frames - 1) * 1e6 / static_cast<double>(passed_us);
        }
        if ((frames >= kFramesWatched || passed_us > kWatchUs) &&
            (!result.key_frame.empty() || passed_us > kMaxKeyFrameWatchUs)) {
            return result;
        }
    }
}

}  // namespace lookhaven::media
