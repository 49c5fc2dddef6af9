// SPDX-License-Identifier: Apache-2.0
//
// How a live stream goes from the rings of one host into those of another.
//
//   kFormat of the sound, unless it is silent, and of the picture; then frames as they are written, and kClock
//
// Formats do not change within a connection. Hosts may be of two versions, so what is here
// only grows: types that the receiver does not know are skipped.
#pragma once

#include <array>
#include <bit>
#include <cstdint>

#include "standalone/ring/stream.h"

namespace lookhaven::ring {

static_assert(std::endian::native == std::endian::little, "messages are in little-endian byte order");

enum class MessageType : std::uint8_t { kFormat = 1, kFrame, kClock };

// In front of every body.
struct MessageHead {
    std::uint8_t type = 0;
    std::uint8_t medium = 0;  // of kFormat and kFrame: a base::Medium
    std::uint8_t is_key = 0;  // of kFrame
    std::uint8_t unused = 0;
    std::uint32_t body_bytes = 0;
    // By the sender's monotonic clock: when the frame was captured; of the others, when they were sent.
    std::int64_t timestamp_us = 0;
};
static_assert(sizeof(MessageHead) == 16);

// The body of kFormat, in front of its extra data. The body of kFrame is the picture or sound alone; kClock has none.
struct FormatBody {
    std::int32_t width = 0;  // 0 for sound
    std::int32_t height = 0;
    std::array<char, kMaxCodecLength + 1> codec{};  // ends with a zero
};
static_assert(sizeof(FormatBody) == 40);

}  // namespace lookhaven::ring
