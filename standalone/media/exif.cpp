// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/exif.h"

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace lookhaven::media {

namespace {

using Bytes = std::span<const std::uint8_t>;

constexpr std::uint8_t kApplication1 = 0xe1;
constexpr std::uint8_t kStartOfScan = 0xda;
constexpr std::string_view kExif("Exif\0\0", 6);
constexpr std::uint32_t kOrientationTag = 0x0112;
constexpr std::size_t kEntryBytes = 12;

// 0 beyond the end.
std::uint32_t Number(Bytes bytes, std::size_t at, std::size_t size, bool is_big_endian) {
    std::uint32_t number = 0;
    if (at > bytes.size() || size > bytes.size() - at) {
        return 0;
    }
    for (std::size_t i = 0; i < size; ++i) {
        number = number << 8U | bytes[is_big_endian ? at + i : at + size - 1 - i];
    }
    return number;
}

// tiff: a file of that format, as EXIF is.
int OrientationIn(Bytes tiff) {
    const bool is_big_endian = Number(tiff, 0, 2, true) == 0x4d4d;
    const auto number = [&](std::size_t at, std::size_t size) { return Number(tiff, at, size, is_big_endian); };
    const std::size_t directory = number(4, 4);
    const std::size_t entries = number(directory, 2);
    for (std::size_t i = 0; i < entries; ++i) {
        const std::size_t entry = directory + 2 + i * kEntryBytes;
        if (number(entry, 2) == kOrientationTag) {
            const auto orientation = static_cast<int>(number(entry + 8, 2));
            return orientation >= 1 && orientation <= 8 ? orientation : 1;
        }
    }
    return 1;
}

}  // namespace

int OrientationOf(Bytes jpeg) {
    for (std::size_t at = 2; at + 4 <= jpeg.size() && jpeg[at] == 0xff && jpeg[at + 1] != kStartOfScan;) {
        const std::size_t length = Number(jpeg, at + 2, 2, true);
        const Bytes segment =
            jpeg.subspan(at + 4, std::min(std::max<std::size_t>(length, 2) - 2, jpeg.size() - at - 4));
        if (jpeg[at + 1] == kApplication1 && segment.size() >= kExif.size() &&
            std::equal(kExif.begin(), kExif.end(), segment.begin())) {
            return OrientationIn(segment.subspan(kExif.size()));
        }
        at += 2 + std::max<std::size_t>(length, 2);
    }
    return 1;
}

}  // namespace lookhaven::media
