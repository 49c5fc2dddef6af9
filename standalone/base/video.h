// SPDX-License-Identifier: Apache-2.0
//
// Terms shared by all parts: media, codecs, why something is recorded, and how large and long it may be.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace lookhaven::base {

// The numbers are stored in shared memory.
enum class Medium : std::int32_t { kVideo = 0, kAudio = 1 };

// The numbers of video codecs are stored, and go to clients; those of sound never leave the process.
enum class Codec : int { kMjpeg = 1, kH264 = 3, kH265 = 6, kAac = 101, kPcmMulaw, kPcmAlaw, kOpus };

// False for sound, and for a number that is no codec's.
bool IsVideo(Codec codec);

// "MJPEG", "H264", "H265", "AAC", "PCMU", "PCMA", "OPUS": as files, rings, rows and clients spell it. A literal; "" for
// a number that is no codec's.
const char* CodecName(Codec codec);

// The reverse: exactly one of those spellings, else nothing.
std::optional<Codec> CodecNamed(std::string_view name);

// Why it was recorded. The numbers are stored in rows and files, and go to clients.
constexpr int kReasonContinuous = 1;
constexpr int kReasonAlarm = 3;

// The largest frame or sound block. Sources drop what is larger, readers treat it as corruption.
constexpr std::int32_t kMaxFrameBytes = 4'194'303;

// No event, and so no recording, is longer; searches rely on it.
constexpr std::int64_t kMaxRecordingSeconds = 7200;

// The largest width and height of a camera's picture.
constexpr int kMaxSidePixels = 8192;

}  // namespace lookhaven::base
