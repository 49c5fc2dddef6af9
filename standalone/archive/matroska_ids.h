// SPDX-License-Identifier: Apache-2.0
//
// Numbers of the Matroska format that more than one reader needs.
#pragma once

#include <cstdint>

namespace lookhaven::archive::matroska {

// Element ids, including their length marker, as in the file.
constexpr std::uint32_t kEbml = 0x1A45DFA3;
constexpr std::uint32_t kSegment = 0x18538067;
constexpr std::uint32_t kSeekHead = 0x114D9B74;
constexpr std::uint32_t kInfo = 0x1549A966;
constexpr std::uint32_t kTimestampScale = 0x2AD7B1;
constexpr std::uint32_t kDateUtc = 0x4461;
constexpr std::uint32_t kTracks = 0x1654AE6B;
constexpr std::uint32_t kTrackEntry = 0xAE;
constexpr std::uint32_t kTrackNumber = 0xD7;
constexpr std::uint32_t kCodecId = 0x86;
constexpr std::uint32_t kCodecPrivate = 0x63A2;
constexpr std::uint32_t kVideo = 0xE0;
constexpr std::uint32_t kPixelWidth = 0xB0;
constexpr std::uint32_t kPixelHeight = 0xBA;
constexpr std::uint32_t kCluster = 0x1F43B675;
constexpr std::uint32_t kTimestamp = 0xE7;
constexpr std::uint32_t kSimpleBlock = 0xA3;
constexpr std::uint32_t kBlockGroup = 0xA0;
constexpr std::uint32_t kBlock = 0xA1;
constexpr std::uint32_t kReferenceBlock = 0xFB;
constexpr std::uint32_t kCues = 0x1C53BB6B;
constexpr std::uint32_t kTags = 0x1254C367;
constexpr std::uint32_t kVoid = 0xEC;

// Set in a block's flags when it holds more than one frame.
constexpr std::uint8_t kLacingFlags = 0x06;

}  // namespace lookhaven::archive::matroska
