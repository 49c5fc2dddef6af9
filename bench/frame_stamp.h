// SPDX-License-Identifier: Apache-2.0
//
// A time stamp inside a picture: it travels untouched from the ring to the viewer.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

namespace bench {

// JPEG's start marker, a comment marker with its length, the magic text and twenty digits of monotonic microseconds.
inline constexpr std::string_view kMagic = "LHBENCH1";
inline constexpr std::size_t kMagicAt = 6;
inline constexpr std::size_t kStampedBytes = kMagicAt + kMagic.size() + 20;

// A block that begins like a JPEG picture and has room for a stamp.
inline std::vector<char> MakeFrame(std::size_t size_bytes) {
    std::vector<char> frame(size_bytes);
    std::uint32_t state = 1;
    for (char& byte : frame) {
        state = state * 1664525U + 1013904223U;
        byte = static_cast<char>(state >> 25);  // below 128: no marker inside
    }
    const std::array<char, kMagicAt> head{'\xff', '\xd8', '\xff', '\xfe', 0, 30};
    std::copy(head.begin(), head.end(), frame.begin());
    return frame;
}

inline void WriteStamp(char* frame, std::int64_t micros) {
    std::array<char, 32> digits{};
    std::snprintf(digits.data(), digits.size(), "%020lld", static_cast<long long>(micros));
    kMagic.copy(frame + kMagicAt, kMagic.size());
    std::copy_n(digits.data(), 20, frame + kMagicAt + kMagic.size());
}

// The stamp in the first bytes of a picture, or 0 when it has none.
inline std::int64_t ReadStamp(std::string_view first_bytes) {
    if (first_bytes.size() < kStampedBytes || first_bytes.substr(kMagicAt, kMagic.size()) != kMagic) {
        return 0;
    }
    return std::strtoll(std::string(first_bytes.substr(kMagicAt + kMagic.size(), 20)).c_str(), nullptr, 10);
}

}  // namespace bench
