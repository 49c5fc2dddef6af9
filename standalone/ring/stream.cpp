// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/stream.h"

#include <algorithm>
#include <bit>

namespace lookhaven::ring {

std::string NameOf(const StreamId& id) {
    return "camera " + std::to_string(id.camera) + " stream " + std::to_string(id.stream) +
           (id.medium == Medium::kVideo ? " video" : " audio");
}

Geometry GeometryFor(const StreamEstimate& estimate) {
    const bool is_audio = estimate.medium == Medium::kAudio;
    // Cameras send a key frame every one to five seconds; ten seconds hold one whole group besides the running one.
    const double seconds = is_audio || estimate.every_frame_is_key ? 3 : 10;
    constexpr double kUnknownVideoBits = 6e6;
    constexpr double kUnknownAudioBits = 256e3;
    const double bits = estimate.bits_per_second > 0 ? static_cast<double>(estimate.bits_per_second)
                        : is_audio                   ? kUnknownAudioBits
                                                     : kUnknownVideoBits;
    const double largest = static_cast<double>(std::max<std::int64_t>(estimate.largest_frame_bytes, 0));
    const double fps = estimate.frames_per_second > 0 ? estimate.frames_per_second : is_audio ? 50 : 30;
    // Space for several of the largest frames lets the writer skip what slow viewers are sending.
    const double bytes = std::max(bits / 8 * seconds, 16 * largest);
    const auto arena = static_cast<std::uint64_t>(std::clamp(bytes, is_audio ? 65536.0 : 1048576.0, 268435456.0));
    const auto slots = static_cast<std::uint32_t>(std::clamp(fps * seconds * 1.5, 128.0, 8192.0));
    return {std::bit_ceil(slots), std::bit_ceil(arena)};
}

}  // namespace lookhaven::ring
