// SPDX-License-Identifier: Apache-2.0
//
// A character is a set of lines, separated by commas; a line is a sequence of points, each two hexadecimal digits: x
// from 0 to 8, then y from 0 at the top to c on the base line.
#include "standalone/pattern/glyphs.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <string>

namespace lookhaven::pattern {

namespace {

constexpr double kGridHeight = 12;
constexpr double kMargin = 1.0;  // around the grid, for the width of the pen
constexpr double kPenRadius = 0.72;

const char* StrokesOf(char character) {
    static constexpr std::array<const char*, 26> kLetters{
        "0c 40 8c,18 78",                       // A
        "06 66 84 82 60 00 0c 6c 8a 88 66",     // B
        "82 60 20 02 0a 2c 6c 8a",              // C
        "00 50 83 89 5c 0c 00",                 // D
        "80 00 0c 8c,06 66",                    // E
        "80 00 0c,06 66",                       // F
        "82 60 20 02 0a 2c 6c 8a 87 57",        // G
        "00 0c,80 8c,06 86",                    // H
        "20 60,40 4c,2c 6c",                    // I
        "80 8a 6c 2c 0a",                       // J
        "00 0c,80 06 8c",                       // K
        "00 0c 8c",                             // L
        "0c 00 46 80 8c",                       // M
        "0c 00 8c 80",                          // N
        "20 60 82 8a 6c 2c 0a 02 20",           // O
        "0c 00 60 82 84 66 06",                 // P
        "20 60 82 8a 6c 2c 0a 02 20,59 8c",     // Q
        "0c 00 60 82 84 66 06,46 8c",           // R
        "82 60 20 02 04 26 66 88 8a 6c 2c 0a",  // S
        "00 80,40 4c",                          // T
        "00 0a 2c 6c 8a 80",                    // U
        "00 4c 80",                             // V
        "00 2c 45 6c 80",                       // W
        "00 8c,80 0c",                          // X
        "00 46 80,46 4c",                       // Y
        "00 80 0c 8c",                          // Z
    };
    static constexpr std::array<const char*, 10> kDigits{
        "20 60 82 8a 6c 2c 0a 02 20",
        "13 40 4c,1c 7c",
        "02 20 60 82 84 0c 8c",
        "02 20 60 82 84 66 36,66 88 8a 6c 2c 0a",
        "6c 60 08 88",
        "80 00 05 65 87 8a 6c 2c 0a",
        "82 60 20 02 0a 2c 6c 8a 87 65 25 07",
        "00 80 3c",
        "26 04 02 20 60 82 84 66 26 08 0a 2c 6c 8a 88 66",
        "0a 2c 6c 8a 82 60 20 02 05 27 67 85",
    };
    static constexpr std::pair<char, const char*> kSigns[]{
        {':', "43 43,49 49"}, {'.', "4c 4c"},       {'-', "26 66"},
        {'_', "0c 8c"},       {'/', "0c 80"},       {'#', "30 2c,70 6c,04 84,08 88"},
        {'(', "50 33 39 5c"}, {')', "30 53 59 3c"},
    };
    if (character >= 'A' && character <= 'Z') {
        return kLetters[static_cast<std::size_t>(character - 'A')];
    }
    if (character >= '0' && character <= '9') {
        return kDigits[static_cast<std::size_t>(character - '0')];
    }
    for (const auto& [sign, strokes] : kSigns) {
        if (sign == character) {
            return strokes;
        }
    }
    return "";
}

struct Line {
    double x1, y1, x2, y2;

    double Distance(double x, double y) const {
        const double dx = x2 - x1;
        const double dy = y2 - y1;
        const double length2 = dx * dx + dy * dy;
        const double t = length2 == 0 ? 0 : std::clamp(((x - x1) * dx + (y - y1) * dy) / length2, 0.0, 1.0);
        return std::hypot(x - x1 - t * dx, y - y1 - t * dy);
    }
};

double HexDigit(char c) {
    return c >= 'a' ? c - 'a' + 10 : c - '0';
}

std::vector<Line> LinesOf(char character) {
    std::vector<Line> lines;
    const std::string_view strokes = StrokesOf(character);
    for (std::size_t at = 0; at + 5 <= strokes.size(); at += 3) {
        if (strokes[at + 2] == ' ') {
            lines.push_back({HexDigit(strokes[at]), HexDigit(strokes[at + 1]), HexDigit(strokes[at + 3]),
                             HexDigit(strokes[at + 4])});
        }
    }
    return lines;
}

Glyph Draw(char character, int width_px, int height_px) {
    Glyph glyph{width_px, height_px, {}};
    glyph.coverage.resize(static_cast<std::size_t>(width_px) * static_cast<std::size_t>(height_px));
    const std::vector<Line> lines = LinesOf(character);
    const double scale = height_px / (kGridHeight + 2 * kMargin);
    auto pixel = glyph.coverage.begin();
    for (int row = 0; row < height_px; ++row) {
        for (int column = 0; column < width_px; ++column, ++pixel) {
            double nearest = 1e9;
            for (const Line& line : lines) {
                nearest =
                    std::min(nearest, line.Distance((column + 0.5) / scale - kMargin, (row + 0.5) / scale - kMargin));
            }
            *pixel = static_cast<std::uint8_t>(255 * std::clamp((kPenRadius - nearest) * scale + 0.5, 0.0, 1.0));
        }
    }
    return glyph;
}

}  // namespace

GlyphSet::GlyphSet(int height_px) : height_px_(height_px), advance_px_(std::max(1, height_px * 11 / 14)) {
    for (std::size_t c = 0; c < glyphs_.size(); ++c) {
        const int capital = std::toupper(static_cast<int>(c));
        glyphs_[c] = Draw(static_cast<char>(capital), advance_px_, height_px);
    }
}

const Glyph& GlyphSet::Of(char character) const {
    return glyphs_[static_cast<unsigned char>(character) < glyphs_.size() ? static_cast<std::size_t>(character) : ' '];
}

}  // namespace lookhaven::pattern
