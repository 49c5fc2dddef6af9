// SPDX-License-Identifier: Apache-2.0
#include "standalone/pattern/landscape.h"

#include <algorithm>
#include <cmath>

namespace lookhaven::pattern {

namespace {

struct Colour {
    double red, green, blue;
};

Colour Mix(const Colour& a, const Colour& b, double share) {
    return {a.red + (b.red - a.red) * share, a.green + (b.green - a.green) * share, a.blue + (b.blue - a.blue) * share};
}

struct Palette {
    Colour zenith, sky, horizon, ground;
};

constexpr std::array<Palette, 4> kPalettes{{
    {{9, 13, 32}, {38, 52, 98}, {206, 128, 104}, {8, 12, 22}},    // evening
    {{6, 20, 28}, {20, 66, 82}, {150, 176, 150}, {5, 15, 18}},    // early morning
    {{17, 11, 36}, {62, 42, 100}, {198, 112, 140}, {12, 9, 22}},  // after sunset
    {{8, 14, 24}, {34, 50, 72}, {192, 158, 110}, {10, 13, 18}},   // before rain
}};

// The eight bars, dimmed so that they do not dominate the picture.
constexpr std::array<Colour, 8> kBars{{{190, 190, 190},
                                       {190, 184, 40},
                                       {40, 180, 184},
                                       {44, 176, 60},
                                       {178, 48, 168},
                                       {184, 46, 46},
                                       {44, 58, 182},
                                       {18, 18, 22}}};

// A random generator with the same numbers on every platform, unlike the distributions of the standard library.
class Random {
  public:
    explicit Random(std::uint32_t seed) : state_(seed | 1) {}
    // 0 … 1
    double Roll() {
        state_ ^= state_ << 13;
        state_ ^= state_ >> 17;
        state_ ^= state_ << 5;
        return (state_ >> 8) / 16777216.0;
    }

  private:
    std::uint32_t state_;
};

std::uint32_t Hash(std::string_view text) {
    std::uint32_t hash = 2166136261u;
    for (const char c : text) {
        hash = (hash ^ static_cast<unsigned char>(c)) * 16777619u;
    }
    return hash;
}

class Canvas {
  public:
    Canvas(int width, int height)
        : width_(width),
          height_(height),
          pixels_(static_cast<std::size_t>(width) * static_cast<std::size_t>(height)) {}

    Colour& At(int x, int y) {
        return pixels_[static_cast<std::size_t>(y) * static_cast<std::size_t>(width_) + static_cast<std::size_t>(x)];
    }
    Picture ToPicture(Random& random);

  private:
    int width_;
    int height_;
    std::vector<Colour> pixels_;
};

// Noise below one step of luma prevents banding in smooth skies.
Picture Canvas::ToPicture(Random& random) {
    Picture picture;
    for (std::size_t p = 0; p < picture.size(); ++p) {
        const int shrink = p == 0 ? 1 : 2;
        picture[p] = {width_ / shrink, height_ / shrink, {}};
        for (int y = 0; y < height_; y += shrink) {
            for (int x = 0; x < width_; x += shrink) {
                const Colour& c = At(x, y);
                const double value = p == 0   ? 0.299 * c.red + 0.587 * c.green + 0.114 * c.blue
                                     : p == 1 ? 128 - 0.168736 * c.red - 0.331264 * c.green + 0.5 * c.blue
                                              : 128 + 0.5 * c.red - 0.418688 * c.green - 0.081312 * c.blue;
                picture[p].pixels.push_back(static_cast<std::uint8_t>(std::clamp(value + random.Roll(), 0.0, 255.0)));
            }
        }
    }
    return picture;
}

void DrawSky(Canvas& canvas, const Palette& palette, int width, int height, int unit_px, Random& random) {
    for (int y = 0; y < height; ++y) {
        const double down = std::min(1.0, y / (0.72 * height));
        const Colour colour = down < 0.6 ? Mix(palette.zenith, palette.sky, down / 0.6)
                                         : Mix(palette.sky, palette.horizon, std::pow((down - 0.6) / 0.4, 1.6));
        for (int x = 0; x < width; ++x) {
            canvas.At(x, y) = colour;
        }
    }
    const int star_px = std::max(1, unit_px / 5);
    for (int star = 0; star < 90; ++star) {
        const int x = static_cast<int>(random.Roll() * (width - star_px));
        const int y = static_cast<int>(random.Roll() * random.Roll() * 0.5 * height);
        const double brightness = 0.12 + 0.5 * random.Roll() * random.Roll();
        for (int i = 0; i < star_px * star_px; ++i) {
            Colour& pixel = canvas.At(x + i % star_px, y + i / star_px);
            pixel = Mix(pixel, {255, 250, 240}, brightness);
        }
    }
}

// Four ranges of hills, the distant ones pale with haze.
std::vector<int> DrawHills(Canvas& canvas, const Palette& palette, int width, int height, Random& random) {
    std::vector<int> ridge(static_cast<std::size_t>(width), height);
    for (const double near : {0.0, 0.33, 0.66, 1.0}) {
        const Colour crest = Mix(Mix(palette.horizon, palette.sky, 0.55), palette.ground, 0.25 + 0.75 * near);
        const Colour foot = Mix(crest, palette.horizon, 0.22 * (1 - near));
        std::array<double, 4> phase{};
        std::generate(phase.begin(), phase.end(), [&] { return random.Roll() * 6.283; });
        for (int x = 0; x < width; ++x) {
            double swell = 0;
            for (std::size_t wave = 0; wave < phase.size(); ++wave) {
                const double n = std::pow(2.1, static_cast<double>(wave));
                swell += std::sin((1.4 + near) * n * 3.1 * x / width + phase[wave]) / (n * 1.15);
            }
            const int top = std::clamp(
                static_cast<int>(height * (0.58 + 0.19 * near - 0.055 * swell * (1.1 - 0.5 * near))), 0, height - 1);
            ridge[static_cast<std::size_t>(x)] = std::min(ridge[static_cast<std::size_t>(x)], top);
            for (int y = top; y < height; ++y) {
                canvas.At(x, y) = Mix(crest, foot, std::min(1.0, (y - top) / (0.16 * height)));
            }
        }
    }
    return ridge;
}

void DrawBars(Canvas& canvas, int width, int height, int bar_height_px) {
    for (int y = height - bar_height_px; y < height; ++y) {
        for (int x = 0; x < width; ++x) {
            canvas.At(x, y) = kBars[static_cast<std::size_t>(x) * kBars.size() / static_cast<std::size_t>(width)];
        }
    }
}

}  // namespace

Landscape DrawLandscape(int width, int height, int unit_px, std::string_view seed) {
    const std::uint32_t hash = Hash(seed);
    const Palette& palette = kPalettes[hash >> 30];
    Random random(hash);
    Canvas canvas(width, height);
    DrawSky(canvas, palette, width, height, unit_px, random);
    std::vector<int> ridge = DrawHills(canvas, palette, width, height, random);
    DrawBars(canvas, width, height, 2 * unit_px);
    return {canvas.ToPicture(random), std::move(ridge)};
}

}  // namespace lookhaven::pattern
