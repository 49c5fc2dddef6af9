// SPDX-License-Identifier: Apache-2.0
//
// A temporary folder, and recordings in it that have an index and no contents.
#pragma once

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/layout.h"
#include "test/support/folder.h"

namespace lookhaven::test {

using ArchiveFolder = TemporaryFolder;

inline std::string Contents(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

inline void Write(const std::filesystem::path& path, const std::string& contents) {
    std::ofstream(path, std::ios::binary) << contents;
}

inline archive::IndexHeader PlainHeader(std::int64_t start_wall_ms) {
    return {"H264", "AAC", 640, 360, start_wall_ms, 1};
}

// Frames of 10 bytes, 20 apart; every tenth is a key frame.
inline std::vector<archive::FrameEntry> FramesAt(const std::vector<std::uint32_t>& times_ms) {
    std::vector<archive::FrameEntry> frames;
    for (const std::uint32_t time_ms : times_ms) {
        frames.push_back({100 + 20 * frames.size(), 10, time_ms, frames.size() % 10 == 0});
    }
    return frames;
}

// A recording whose index is still being written.
inline archive::FrameIndexWriter BeginRecording(const std::filesystem::path& path, std::int64_t start_wall_ms) {
    std::filesystem::create_directories(path.parent_path());
    Write(path, "");
    std::filesystem::resize_file(path, 1 << 30);
    return archive::FrameIndexWriter(archive::IndexPathOf(path), PlainHeader(start_wall_ms));
}

inline void MakeRecording(const std::filesystem::path& path, const std::vector<std::uint32_t>& times_ms,
                          std::int64_t start_wall_ms = 1'000'000) {
    archive::FrameIndexWriter index = BeginRecording(path, start_wall_ms);
    index.Append(FramesAt(times_ms));
    index.Finish();
}

}  // namespace lookhaven::test
