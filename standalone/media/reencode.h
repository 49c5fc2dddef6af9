// SPDX-License-Identifier: Apache-2.0
//
// Re-encodes an untrusted picture: whatever its file held besides the pixels is gone.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

namespace lookhaven::media {

// A picture of more is not decoded: one of four samples a pixel fits into libav's largest block.
constexpr std::int64_t kMaxReencodedPixels = 30'000'000;
constexpr int kMaxReencodedSidePixels = 16'384;

struct Reencoded {
    enum class Outcome : char {
        kPng = 'p',
        kJpeg = 'j',
        kBroken = 'b',         // cannot be decoded
        kTooManyPixels = 'm',  // more than the above; nothing was decoded
        kTooLarge = 'l',       // the new file would be
    } outcome = Outcome::kBroken;
    std::vector<std::uint8_t> file;  // of kPng and kJpeg
};

// type: "png", "jpg" or "webp", as which the file is decoded. A JPEG becomes an upright JPEG, a WebP of lossy
// compression without transparency a JPEG as well. Any other becomes a PNG, or where that exceeds max_bytes and
// nothing of it can be transparent, a JPEG. Starts no thread; takes up to 15 bytes and 0.2 µs a pixel.
// Throws std::bad_alloc.
Reencoded Reencode(std::string_view type, std::span<const std::uint8_t> file, std::size_t max_bytes);

}  // namespace lookhaven::media
