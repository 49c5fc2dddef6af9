// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/probe.h"

namespace lookhaven::media {

namespace {

constexpr int kFramesWatched = 25;
constexpr std::int64_t kWatchUs = 1'500'000;

}  // namespace

ProbeResult ProbeSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options) {
    const std::unique_ptr<Source> source = OpenSource(kinds, url, options, {});
    ProbeResult result;
    result.audio = source->Audio();
    std::int64_t first_us = 0;
    for (int frames = 0; frames < kFramesWatched;) {
        const Packet packet = source->Next();
        if (packet.medium == Medium::kAudio) {
            continue;
        }
        if (frames++ == 0) {
            first_us = packet.timestamp_us;
        }
        result.video = *packet.format;
        const std::int64_t passed_us = packet.timestamp_us - first_us;
        if (passed_us > 0) {
            result.frames_per_second = (frames - 1) * 1e6 / static_cast<double>(passed_us);
        }
        if (passed_us > kWatchUs) {
            break;
        }
    }
    return result;
}

}  // namespace lookhaven::media
