// SPDX-License-Identifier: Apache-2.0
//
// A small stroke font, drawn smoothly at any size.
#pragma once

#include <array>
#include <cstdint>
#include <string_view>
#include <vector>

namespace lookhaven::pattern {

// One character as coverage, 0 … 255 a pixel, row by row.
struct Glyph {
    int width = 0;
    int height = 0;
    std::vector<std::uint8_t> coverage;
};

// The font at one size. Knows A-Z (small letters look like capitals), digits and .:-_/#(); anything else is a space.
class GlyphSet {
  public:
    explicit GlyphSet(int height_px);

    const Glyph& Of(char character) const;
    // Pixels from one character to the next; the same for all, so that a running clock does not jitter.
    int Advance() const { return advance_px_; }
    int Height() const { return height_px_; }

  private:
    int height_px_;
    int advance_px_;
    std::array<Glyph, 128> glyphs_;
};

}  // namespace lookhaven::pattern
