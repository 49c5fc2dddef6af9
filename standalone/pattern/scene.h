// SPDX-License-Identifier: Apache-2.0
//
// Draws the test pattern: a landscape at dusk with a slowly moving moon, a running clock, a frame number, a label and
// colour bars.
//
// Why so        The pattern must be cheap on small machines. So the background is drawn once, and each frame restores
//               the areas that the last frame drew on and draws only what moves.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/pattern/glyphs.h"
#include "standalone/pattern/landscape.h"

namespace lookhaven::pattern {

class Scene {
  public:
    // Width and height must be even. The label also determines the colours.
    Scene(int width, int height, const std::string& label);

    // The clock shows wall_millis as local time. The picture is valid until the next call.
    const Picture& Draw(std::int64_t frame_number, std::int64_t wall_millis);

  private:
    struct Area {
        int x, y, width, height;
    };

    void Restore(const Area& area);
    void DrawMoon(std::int64_t wall_millis);
    void DrawMarker(std::int64_t wall_millis);
    void DrawText(Picture& picture, const GlyphSet& glyphs, int x, int y, std::string_view text);

    int width_;
    int height_;
    int unit_px_;  // of the layout: 1/90 of the height
    GlyphSet large_;
    GlyphSet small_;
    std::vector<int> ridge_;  // by column: the first row of the hills
    std::vector<std::uint8_t> moon_;
    int moon_size_px_;
    Picture background_;
    Picture picture_;
    std::vector<Area> drawn_;  // areas that differ from the background
};

}  // namespace lookhaven::pattern
