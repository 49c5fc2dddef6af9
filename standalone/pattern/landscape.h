// SPDX-License-Identifier: Apache-2.0
//
// Draws the still part of the test pattern.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace lookhaven::pattern {

// One plane of a picture; rows follow each other without a gap.
struct Plane {
    int width = 0;
    int height = 0;
    std::vector<std::uint8_t> pixels;

    std::uint8_t* Row(int row) { return pixels.data() + static_cast<std::ptrdiff_t>(row) * width; }
    const std::uint8_t* Row(int row) const { return pixels.data() + static_cast<std::ptrdiff_t>(row) * width; }
};

// Luma and two chroma planes of half the width and height, full range.
using Picture = std::array<Plane, 3>;

struct Landscape {
    Picture picture;
    std::vector<int> ridge;  // by column: the row at which the hills begin
};

// Sky, stars, hills and colour bars. The seed chooses colours and shapes, the same ones every time. Sizes are even.
Landscape DrawLandscape(int width, int height, int unit_px, std::string_view seed);

}  // namespace lookhaven::pattern
