// SPDX-License-Identifier: Apache-2.0
//
// What a source hands on: one frame or audio block at a time, with the format it is in.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace lookhaven::media {

enum class Medium { kVideo, kAudio };

enum class Codec { kMjpeg, kH264, kH265, kAac, kPcmMulaw, kPcmAlaw, kOpus };

// "MJPEG", "H264", "H265", "AAC", "PCMU", "PCMA", "OPUS"; a literal.
const char* CodecName(Codec codec);

// No camera sends larger frames in earnest; a source leaves out what is larger.
constexpr std::size_t kMaxFrameBytes = 4'194'303;

// How a medium is coded. Video has a size, audio a rate and channels; the other fields are 0.
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

// One frame. H.264 and H.265 come as Annex B, every key frame behind its parameter sets; AAC comes raw; MJPEG is the
// camera's own JPEG, byte by byte.
struct Packet {
    Medium medium = Medium::kVideo;
    std::span<const std::uint8_t> data;  // valid until the source is asked for the next packet
    std::int64_t timestamp_us = 0;       // base::MonotonicMicros at capture, as near as known; one clock for both media
    bool key_frame = false;
    const StreamFormat* format = nullptr;  // never null; lives as long as the data
};

}  // namespace lookhaven::media
