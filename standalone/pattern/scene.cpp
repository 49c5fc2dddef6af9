// SPDX-License-Identifier: Apache-2.0
#include "standalone/pattern/scene.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <tuple>

namespace lookhaven::pattern {

namespace {

constexpr std::array<std::uint8_t, 3> kMoonColour{236, 120, 134};
constexpr std::array<std::uint8_t, 3> kTextColour{238, 128, 128};
constexpr std::array<std::uint8_t, 3> kMarkerColour{250, 128, 128};
constexpr std::int64_t kMoonPeriodMs = 120'000;
constexpr std::int64_t kMarkerPeriodMs = 4'000;

std::uint8_t Blend(std::uint8_t below, std::uint8_t above, int coverage) {
    return static_cast<std::uint8_t>(below + (above - below) * coverage / 255);
}

// A bright disc in a soft halo, as coverage.
std::vector<std::uint8_t> DrawMoonSprite(int size_px, double radius_px) {
    std::vector<std::uint8_t> sprite;
    for (int y = 0; y < size_px; ++y) {
        for (int x = 0; x < size_px; ++x) {
            const double distance = std::hypot(x + 0.5 - size_px / 2.0, y + 0.5 - size_px / 2.0);
            const double disc = std::clamp(radius_px - distance + 0.5, 0.0, 1.0);
            const double reach = std::clamp((distance - radius_px) / (size_px / 2.0 - radius_px), 0.0, 1.0);
            const double halo = 0.34 * std::pow(1 - reach, 3);
            sprite.push_back(static_cast<std::uint8_t>(255 * std::max(disc, halo)));
        }
    }
    return sprite;
}

std::string ClockText(std::int64_t wall_millis) {
    const std::time_t seconds = static_cast<std::time_t>(wall_millis / 1000);
    std::tm local{};
    localtime_r(&seconds, &local);
    std::array<char, 40> text{};
    std::snprintf(text.data(), text.size(), "%02d:%02d:%02d.%03d", local.tm_hour, local.tm_min, local.tm_sec,
                  static_cast<int>(wall_millis % 1000));
    return text.data();
}

}  // namespace

Scene::Scene(int width, int height, const std::string& label)
    : width_(width),
      height_(height),
      unit_px_(std::max(1, height / 90)),
      large_(5 * unit_px_),
      small_(3 * unit_px_),
      moon_size_px_(std::min({26 * unit_px_, width, height}) & ~1) {
    moon_ = DrawMoonSprite(moon_size_px_, 3.4 * unit_px_);
    Landscape landscape = DrawLandscape(width, height, unit_px_, label);
    background_ = std::move(landscape.picture);
    ridge_ = std::move(landscape.ridge);
    DrawText(background_, large_, 4 * unit_px_, height_ - 13 * unit_px_, label);
    DrawText(background_, small_, 4 * unit_px_, height_ - 7 * unit_px_,
             std::to_string(width) + "x" + std::to_string(height) + " test pattern");
    picture_ = background_;
}

const Picture& Scene::Draw(std::int64_t frame_number, std::int64_t wall_millis) {
    for (const Area& area : drawn_) {
        Restore(area);
    }
    drawn_.clear();
    DrawMoon(wall_millis);
    DrawMarker(wall_millis);
    std::array<char, 40> frame{};
    std::snprintf(frame.data(), frame.size(), "frame %06lld", static_cast<long long>(frame_number));
    for (const auto& [glyphs, text, rows_up] :
         {std::tuple{&large_, ClockText(wall_millis), 13}, std::tuple{&small_, std::string(frame.data()), 7}}) {
        const int text_width = glyphs->Advance() * static_cast<int>(text.size());
        const Area area{width_ - 4 * unit_px_ - text_width, height_ - rows_up * unit_px_, text_width, glyphs->Height()};
        DrawText(picture_, *glyphs, area.x, area.y, text);
        drawn_.push_back(area);
    }
    return picture_;
}

void Scene::Restore(const Area& area) {
    for (std::size_t p = 0; p < picture_.size(); ++p) {
        const int shrink = p == 0 ? 1 : 2;
        const int left = std::max(0, area.x / shrink - 1);
        const int right = std::min(picture_[p].width, (area.x + area.width) / shrink + 1);
        const int top = std::max(0, area.y / shrink - 1);
        const int bottom = std::min(picture_[p].height, (area.y + area.height) / shrink + 1);
        for (int row = top; row < bottom && right > left; ++row) {
            std::memcpy(picture_[p].Row(row) + left, background_[p].Row(row) + left,
                        static_cast<std::size_t>(right - left));
        }
    }
}

// The moon rises on the left and sets on the right, behind the hills.
void Scene::DrawMoon(std::int64_t wall_millis) {
    const double turn = static_cast<double>(wall_millis % kMoonPeriodMs) / kMoonPeriodMs;
    const int span = width_ + moon_size_px_;
    const int x0 = (static_cast<int>(turn * span) - moon_size_px_) & ~1;
    const int y0 = (static_cast<int>(height_ * (0.22 + 0.5 * std::pow(turn - 0.5, 2) * 2)) - moon_size_px_ / 2) & ~1;
    for (int y = std::max(0, -y0); y < moon_size_px_ && y0 + y < height_; ++y) {
        const std::uint8_t* coverage = moon_.data() + static_cast<std::ptrdiff_t>(y) * moon_size_px_;
        const int row = y0 + y;
        const bool chroma = row % 2 == 0;
        for (int x = std::max(0, -x0); x < moon_size_px_ && x0 + x < width_; ++x) {
            const int column = x0 + x;
            if (coverage[x] == 0 || row >= ridge_[static_cast<std::size_t>(column)]) {
                continue;
            }
            std::uint8_t& luma = picture_[0].Row(row)[column];
            luma = Blend(luma, kMoonColour[0], coverage[x]);
            for (std::size_t p = 1; chroma && column % 2 == 0 && p < 3; ++p) {
                std::uint8_t& pixel = picture_[p].Row(row / 2)[column / 2];
                pixel = Blend(pixel, kMoonColour[p], coverage[x]);
            }
        }
    }
    drawn_.push_back({x0, y0, moon_size_px_, moon_size_px_});
}

// A light that moves steadily along the colour bars, so that stutter is visible.
void Scene::DrawMarker(std::int64_t wall_millis) {
    const int marker_px = 4 * unit_px_;
    const auto step = static_cast<int>((wall_millis % kMarkerPeriodMs) * (width_ - marker_px) / kMarkerPeriodMs);
    const Area area{step & ~1, height_ - 2 * unit_px_, marker_px, 2 * unit_px_};
    for (std::size_t p = 0; p < picture_.size(); ++p) {
        const int shrink = p == 0 ? 1 : 2;
        for (int row = area.y / shrink; row < picture_[p].height; ++row) {
            std::memset(picture_[p].Row(row) + area.x / shrink, kMarkerColour[p],
                        static_cast<std::size_t>(area.width / shrink));
        }
    }
    drawn_.push_back(area);
}

void Scene::DrawText(Picture& picture, const GlyphSet& glyphs, int x, int y, std::string_view text) {
    for (const char character : text) {
        const Glyph& glyph = glyphs.Of(character);
        const std::uint8_t* coverage = glyph.coverage.data();
        for (int row = y; row < y + glyph.height; ++row) {
            for (int column = x; column < x + glyph.width; ++column, ++coverage) {
                if (*coverage == 0 || row < 0 || row >= height_ || column < 0 || column >= width_) {
                    continue;
                }
                std::uint8_t& luma = picture[0].Row(row)[column];
                luma = Blend(luma, kTextColour[0], *coverage);
                for (std::size_t p = 1; row % 2 == 0 && column % 2 == 0 && p < 3; ++p) {
                    std::uint8_t& pixel = picture[p].Row(row / 2)[column / 2];
                    pixel = Blend(pixel, kTextColour[p], *coverage);
                }
            }
        }
        x += glyphs.Advance();
    }
}

}  // namespace lookhaven::pattern
