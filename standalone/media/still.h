// SPDX-License-Identifier: Apache-2.0
//
// Converts a key frame to a JPEG picture.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// frame: a key frame; H.264 and H.265 as Annex B with parameter sets in front. Starts no thread; takes about 10 ms and
// 20 bytes per pixel. A picture of Motion JPEG is made smaller until it fits into max_bytes. Throws SourceError when
// the frame cannot be decoded, or does not fit.
std::vector<std::uint8_t> JpegOfKeyFrame(Codec codec, std::span<const std::uint8_t> frame,
                                         std::size_t max_bytes = base::kMaxFrameBytes);

}  // namespace lookhaven::media
