// SPDX-License-Identifier: Apache-2.0
//
// Reads the size of a JPEG picture from its header.
#pragma once

#include <cstdint>
#include <optional>
#include <span>

namespace lookhaven::media {

// The largest width and height that cameras are taken with.
constexpr int kMaxSidePixels = 8192;

struct PictureSize {
    int width = 0;
    int height = 0;

    // Neither empty nor so large that it would claim memory beyond measure.
    bool IsUsable() const { return width > 0 && height > 0 && width <= kMaxSidePixels && height <= kMaxSidePixels; }
};

// Nothing when the bytes are not the beginning of a JPEG picture of a usable size. Looks at no more than the header.
std::optional<PictureSize> JpegSize(std::span<const std::uint8_t> jpeg);

}  // namespace lookhaven::media
