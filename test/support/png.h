// SPDX-License-Identifier: Apache-2.0
//
// PNG files as a test wants them: of one colour, with any claims in their heads.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace lookhaven::test {

inline std::string BigEndian(std::uint32_t number) {
    return {static_cast<char>(number >> 24U), static_cast<char>(number >> 16U), static_cast<char>(number >> 8U),
            static_cast<char>(number)};
}

inline std::string PngChunk(std::string_view type, std::string_view data) {
    std::string body(type);
    body += data;
    std::uint32_t crc = ~0U;
    for (const char byte : body) {
        crc ^= static_cast<std::uint8_t>(byte);
        for (int bit = 0; bit < 8; ++bit) {
            crc = crc >> 1U ^ (crc & 1U ? 0xedb88320U : 0U);
        }
    }
    return BigEndian(static_cast<std::uint32_t>(data.size())) + body + BigEndian(~crc);
}

// In zlib's format, uncompressed.
inline std::string Stored(std::string_view data) {
    std::string stream("\x78\x01", 2);
    std::uint32_t low = 1;
    std::uint32_t high = 0;
    for (const char byte : data) {
        low = (low + static_cast<std::uint8_t>(byte)) % 65521;
        high = (high + low) % 65521;
    }
    do {
        const std::string_view block = data.substr(0, 65535);
        data.remove_prefix(block.size());
        const auto size = static_cast<std::uint16_t>(block.size());
        stream += data.empty() ? '\x01' : '\0';
        for (const unsigned part : {unsigned{size}, ~unsigned{size}}) {
            stream += static_cast<char>(part);
            stream += static_cast<char>(part >> 8U);
        }
        stream += block;
    } while (!data.empty());
    return stream + BigEndian(high << 16U | low);
}

// As much of a picture as its rows say: claimed is what the head says of its size.
inline std::string Png(int width, int height, std::array<std::uint8_t, 3> colour, std::string_view more_chunks = "",
                       std::array<std::uint32_t, 2> claimed = {}) {
    std::string rows;
    for (int y = 0; y < height; ++y) {
        rows += '\0';
        for (int x = 0; x < width; ++x) {
            rows.append(colour.begin(), colour.end());
        }
    }
    if (claimed[0] == 0) {
        claimed = {static_cast<std::uint32_t>(width), static_cast<std::uint32_t>(height)};
    }
    const std::string head = BigEndian(claimed[0]) + BigEndian(claimed[1]) + std::string("\x08\x02\0\0\0", 5);
    return "\x89PNG\r\n\x1a\n" + PngChunk("IHDR", head) + std::string(more_chunks) + PngChunk("IDAT", Stored(rows)) +
           PngChunk("IEND", "");
}

}  // namespace lookhaven::test
