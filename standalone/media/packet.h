// SPDX-License-Identifier: Apache-2.0
//
// What a source delivers: one video frame or audio block at a time, with its format.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "standalone/base/video.h"

namespace lookhaven::media {

using base::Codec;
using base::Medium;

// How video or audio is coded. Video has a size, audio a rate and channels; the other fields are 0.
struct StreamFormat {
    Codec codec = Codec::kMjpeg;
    int width = 0;
    int height = 0;
    int sample_rate_hz = 0;
    int channels = 0;
    // H.264 and H.265: the parameter sets as Annex B; AAC: its AudioSpecificConfig; else empty.
    std::vector<std::uint8_t> extra_data;

    bool operator==(const StreamFormat&) const = default;
};

// The formats of what one source sends, or one recording holds.
struct MediaFormat {
    StreamFormat video;
    std::optional<StreamFormat> audio;  // nothing when it is silent

    bool operator==(const MediaFormat&) const = default;
};

// One frame. H.264 and H.265 are Annex B, with parameter sets in front of every key frame; AAC is raw, without ADTS
// headers; MJPEG is exactly the camera's JPEG.
struct Packet {
    Medium medium = Medium::kVideo;
    std::span<const std::uint8_t> data;  // valid until the source is asked for the next packet
    // base::MonotonicMicros at capture, as closely as known; the same clock for both media.
    std::int64_t timestamp_us = 0;
    bool key_frame = false;
    const StreamFormat* format = nullptr;  // never null; lives as long as the data
};

}  // namespace lookhaven::media
