// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/jpeg.h"

namespace lookhaven::media {

std::optional<PictureSize> JpegSize(std::span<const std::uint8_t> jpeg) {
    const auto word = [&](std::size_t at) { return jpeg[at] << 8 | jpeg[at + 1]; };
    if (jpeg.size() < 4 || word(0) != 0xffd8) {
        return std::nullopt;
    }
    for (std::size_t at = 2; at + 9 <= jpeg.size() && jpeg[at] == 0xff;) {
        const int marker = jpeg[at + 1];
        if (marker == 0xff) {
            ++at;  // a fill byte
            continue;
        }
        // A frame header is any of SOF0 … SOF15, except three numbers that mean tables.
        if (marker >= 0xc0 && marker <= 0xcf && marker != 0xc4 && marker != 0xc8 && marker != 0xcc) {
            const PictureSize size{word(at + 7), word(at + 5)};
            return size.IsUsable() ? std::optional(size) : std::nullopt;
        }
        at += 2 + static_cast<std::size_t>(word(at + 2));
    }
    return std::nullopt;
}

}  // namespace lookhaven::media
