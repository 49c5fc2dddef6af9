// SPDX-License-Identifier: Apache-2.0
//
// The orientation of a JPEG picture, from its EXIF data.
#pragma once

#include <cstdint>
#include <span>

namespace lookhaven::media {

// As EXIF counts: 1 upright, 2 to 8 mirrored or turned, 1 where the file does not say. Reads the segments in front of
// the picture only, and never beyond the bytes.
int OrientationOf(std::span<const std::uint8_t> jpeg);

}  // namespace lookhaven::media
