// SPDX-License-Identifier: Apache-2.0
//
// Draws the background of the test pattern.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace lookhaven::pattern {

// One plane of a picture, without gaps between rows.
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
    std::vector<int> ridge;  // by column: the first row of the hills
};

// Sky, stars, hills and colour bars. The same seed always gives the same colours and shapes. Width and height must be
// even.
Landscape DrawLandscape(int width, int height, int unit_px, std::string_view seed);

}  // namespace lookhaven::pattern
