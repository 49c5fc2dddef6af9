// SPDX-License-Identifier: Apache-2.0
//
// Draws any bytes anew as each kind of picture: what comes of it is a picture of that kind, or nothing.
#include "standalone/media/reencode.h"

#include <cstring>

#include "standalone/media/exif.h"
#include "standalone/media/jpeg.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    using Outcome = media::Reencoded::Outcome;
    constexpr std::size_t kMaxBytes = std::size_t{1} << 20;
    const std::span<const std::uint8_t> file(data, size);
    const int orientation = media::OrientationOf(file);
    fuzz::Require(orientation >= 1 && orientation <= 8);
    for (const char* type : {"png", "jpg", "webp"}) {
        const media::Reencoded reencoded = media::Reencode(type, file, kMaxBytes);
        const bool is_picture = reencoded.outcome == Outcome::kPng || reencoded.outcome == Outcome::kJpeg;
        fuzz::Require(is_picture != reencoded.file.empty() && reencoded.file.size() <= kMaxBytes);
        if (reencoded.outcome == Outcome::kPng) {
            fuzz::Require(std::memcmp(reencoded.file.data(), "\x89PNG\r\n\x1a\n", 8) == 0);
        }
    }
    return 0;
}
