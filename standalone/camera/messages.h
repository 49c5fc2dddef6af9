// SPDX-License-Identifier: Apache-2.0
//
// What the recorder and a camera's process say to each other over their socket.
//
//   recorder        one request: the length of its body, then the body
//   camera process  kConfined, perhaps kFormat of its sound, kOpened; then kFormat of its picture before its first
//                   frame and whenever it changes, and frames; kFailure instead of any of them ends it
//
// Both run on one machine and come from one build, so numbers are in the machine's own byte order.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "standalone/base/video.h"
#include "standalone/media/source.h"

namespace lookhaven::camera {

enum class MessageType : std::uint8_t { kConfined = 1, kFormat, kOpened, kFrame, kFailure };

// In front of every body that a camera's process sends.
struct MessageHead {
    std::uint8_t type = 0;
    std::uint8_t medium = 0;  // of kFormat and kFrame: a base::Medium
    std::uint8_t flags = 0;   // of kConfined and kFrame; of kFailure, a base::SignalLoss
    std::uint8_t unused = 0;
    std::uint32_t body_bytes = 0;
    std::int64_t timestamp_us = 0;  // of kFrame
};
static_assert(sizeof(MessageHead) == 16);

constexpr std::uint8_t kKeyFrame = 1;       // kFrame
constexpr std::uint8_t kLacksLandlock = 1;  // kConfined
constexpr std::uint8_t kLacksSystemCallFilter = 2;

// The body of kFormat, in front of its extra data.
struct FormatBody {
    std::int32_t codec = 0;
    std::int32_t width = 0;
    std::int32_t height = 0;
    std::int32_t sample_rate_hz = 0;
    std::int32_t channels = 0;
};
static_assert(sizeof(FormatBody) == 20);

constexpr std::size_t kMaxExtraBytes = 65'536;
constexpr std::size_t kMaxFailureBytes = 1024;

// What to open.
struct Request {
    std::string url;
    media::SourceOptions options;
};

std::vector<std::uint8_t> EncodeFormat(const media::StreamFormat& format);

std::vector<std::uint8_t> EncodeRequest(const Request& request);
// Throws SourceError unless these are exactly the bytes of a request.
Request DecodeRequest(std::span<const std::uint8_t> bytes);

}  // namespace lookhaven::camera
