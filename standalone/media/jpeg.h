// SPDX-License-Identifier: Apache-2.0
//
// Reads the size of a JPEG picture from its header.
#pragma once

#include <cstdint>
#include <optional>
#include <span>

#include "standalone/base/video.h"

namespace lookhaven::media {

struct PictureSize {
    int width = 0;
    int height = 0;

    // Neither empty nor larger than any camera's picture, which would allocate too much memory.
    bool IsUsable() const {
        return width > 0 && height > 0 && width <= base::kMaxSidePixels && height <= base::kMaxSidePixels;
    }
};

// Nothing when the bytes do not begin a JPEG picture of a usable size. Reads the header only.
std::optional<PictureSize> JpegSize(std::span<const std::uint8_t> jpeg);

}  // namespace lookhaven::media
