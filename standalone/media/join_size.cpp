// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/join.h"

namespace lookhaven::media {

namespace {

// What a copy has beyond the part of the recording that it is taken from, at most: for each frame, for each recording,
// and in MP4 for each second of footage, the heads of a fragment and of its sound.
constexpr std::int64_t kMaxFrameOverheadBytes = 64;
constexpr std::int64_t kMaxOverheadBytes = 65'536;
constexpr std::int64_t kMaxSecondOverheadBytes = 2048;

}  // namespace

Container ContainerFor(const archive::IndexHeader& format, bool with_sound) {
    const bool is_video_of_mp4 = format.codec == "H264" || format.codec == "H265";
    const bool is_sound_of_mp4 = !with_sound || format.audio_codec.empty() || format.audio_codec == "AAC";
    return is_video_of_mp4 && is_sound_of_mp4 ? Container::kMp4 : Container::kMatroska;
}

std::int64_t MaxJoinedBytes(const archive::RecordingPart& part, Container container) {
    const std::int64_t seconds = container == Container::kMp4 ? (part.last_ms - part.begin_ms) / 1000 + 2 : 0;
    return part.source_bytes + kMaxOverheadBytes + kMaxFrameOverheadBytes * part.frames +
           kMaxSecondOverheadBytes * seconds;
}

}  // namespace lookhaven::media
