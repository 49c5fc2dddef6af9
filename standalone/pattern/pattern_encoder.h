// SPDX-License-Identifier: Apache-2.0
//
// Encodes the test pattern's pictures.
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>

#include "standalone/media/packet.h"
#include "standalone/pattern/landscape.h"

namespace lookhaven::pattern {

struct PatternSettings {
    int width = 1280;
    int height = 720;
    int fps = 25;
    int gop = 25;      // H.264: frames from one key frame to the next
    int quality = 80;  // MJPEG: 1 … 100
};

struct EncodedPicture {
    std::span<const std::uint8_t> data;  // valid until the next picture
    bool key_frame = false;
};

class PatternEncoder {
  public:
    virtual ~PatternEncoder() = default;
    virtual const media::StreamFormat& Format() const = 0;
    // The picture must have the settings' size, and numbers must grow by one. Throws media::SourceError.
    virtual EncodedPicture Encode(const Picture& picture, std::int64_t number) = 0;
};

// codec: "mjpeg" or "h264". Throws media::SourceError for another, and when its encoder is missing.
std::unique_ptr<PatternEncoder> MakePatternEncoder(const std::string& codec, const PatternSettings& settings);

}  // namespace lookhaven::pattern
