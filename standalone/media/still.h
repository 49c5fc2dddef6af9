// SPDX-License-Identifier: Apache-2.0
//
// Makes a JPEG picture of a key frame.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// The picture of a frame that needs no other; H.264 and H.265 as Annex B behind their parameter sets. Works in this
// thread alone, and takes about 10 ms and 20 bytes a pixel. Throws SourceError when the frame cannot be decoded.
std::vector<std::uint8_t> JpegOfKeyFrame(Codec codec, std::span<const std::uint8_t> frame);

}  // namespace lookhaven::media
