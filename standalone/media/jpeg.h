// SPDX-License-Identifier: Apache-2.0
//
// Reads the size of a JPEG picture from its header.
#pragma once

#include <cstdint>
#include <optional>
#include <span>

namespace lookhaven::media {

struct PictureSize {
    int width = 0;
    int height = 0;
};

// Nothing when the bytes are not the beginning of a JPEG picture. Looks at no more than the header.
std::optional<PictureSize> JpegSize(std::span<const std::uint8_t> jpeg);

}  // namespace lookhaven::media
