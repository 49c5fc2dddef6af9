// SPDX-License-Identifier: Apache-2.0
//
// Draws the test pattern: a landscape at dusk under a slowly moving moon, with a running clock, a frame number, a label
// and colour bars.
//
// Why so        The pattern runs on small machines beside everything else, so the still part is drawn once, and each
//               frame repairs and draws only the places that change.
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
    // Sizes are even. The label chooses the colours too.
    Scene(int width, int height, const std::string& label);

    // Draws the frame of that number and time, which the clock shows as local time. The picture is valid until the next call.
    const Picture& Draw(std::int64_t frame_number, std::int64_t wall_millis);

  private:
    struct Area {
        int x, y, width, height;
    };

    void Restore(const Area& area);
    void DrawMoon(std::int64_t wall_millis);
    void DrawMarker(std::int64_t wall_millis);
    void DrawClock(std::int64_t wall_millis);
    void DrawText(Picture& picture, const GlyphSet& glyphs, int x, int y, std::string_view text);

    int width_;
    int height_;
    int unit_px_;  // of the layout: 1/90 of the height
    GlyphSet large_;
    GlyphSet small_;
    std::vector<int> ridge_;  // by column: the row at which the hills begin
    std::vector<std::uint8_t> moon_;
    int moon_size_px_;
    Picture still_;
    Picture picture_;
    std::vector<Area> drawn_;
};

}  // namespace lookhaven::pattern
