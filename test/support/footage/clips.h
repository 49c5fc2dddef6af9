// SPDX-License-Identifier: Apache-2.0
//
// Footage made by ffmpeg, recorded by our writer, and judged by ffprobe.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "standalone/archive/frame_index.h"
#include "standalone/media/packet.h"
#include "standalone/media/recording_writer.h"

namespace lookhaven::test {

// What the shell command printed, errors included.
std::string Shell(const std::string& command);

// A packet that owns what it needs.
struct OwnedPacket {
    std::vector<std::uint8_t> data;
    base::Medium medium = base::Medium::kVideo;
    std::int64_t time_us = 0;
    bool key_frame = false;
};

struct Clip {
    media::MediaFormat format;
    std::vector<OwnedPacket> packets;

    media::Packet At(std::size_t number) const;
    // The video frames' bytes in file order.
    std::vector<std::vector<std::uint8_t>> Frames() const;
};

// Four seconds of a moving 160x120 picture at 25 frames per second, encoded by ffmpeg with these options. Made once
// each.
const Clip& MakeClip(const std::string& video_options, const std::string& audio_options = "");

inline const char* const kMjpeg = "-c:v mjpeg -q:v 4 -pix_fmt yuvj420p";
inline const char* const kH264 =
    "-c:v libx264 -preset ultrafast -bf 0 -g 25 -pix_fmt yuv420p -vf scale=out_color_matrix=bt709 -colorspace bt709";
inline const char* const kH264Reordered = "-c:v libx264 -preset veryfast -bf 2 -g 25 -pix_fmt yuv420p";
inline const char* const kH265 = "-c:v libx265 -preset ultrafast -bf 2 -g 25 -x265-params log-level=none";

// Records the clip's packets [0, count) into path; finished when close is set, else as it would be after a kill.
void Record(const Clip& clip, const std::filesystem::path& path, bool close = true, std::size_t count = SIZE_MAX,
            std::int64_t start_wall_ms = 1'772'352'930'000);

// What the recording's index says of its frames.
std::vector<archive::FrameEntry> Entries(const std::filesystem::path& recording);

// Decodes the whole file. Each stream's codec and number of frames, one per line ("h264,100"), and ffprobe's
// complaints.
std::string Probe(const std::filesystem::path& path);

}  // namespace lookhaven::test
