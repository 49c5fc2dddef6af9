// SPDX-License-Identifier: Apache-2.0
//
// The paths of files on a storage mount, and which files there are ours.
//
//   <mount>/<camera>/2026-03-01/081530-12.mkv     the recording of event 12, which began at 08:15:30 UTC
//   <mount>/<camera>/2026-03-01/081530-12.index   its frame index (frame_index.h)
//   <mount>/<camera>/2026-03-01/081530-13.span    an event that refers to footage of others (span_file.h)
//   <mount>/<camera>/2026-03-01/seconds           which seconds of the day were recorded (recording_log.h)
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace lookhaven::archive {

enum class FileKind { kRecording, kIndex, kSpan };

// What the path of a file encodes.
struct FileName {
    int camera = 0;
    std::int64_t start_s = 0;  // seconds since the epoch (UTC)
    int event = 0;
    FileKind kind = FileKind::kRecording;

    bool operator==(const FileName&) const = default;
};

// The path relative to the mount, "3/2026-03-01/081530-12.mkv".
std::string PathOf(const FileName& name);

// The reverse; nothing when PathOf does not produce exactly this path. Files with other paths must not be touched.
std::optional<FileName> ParsePath(std::string_view relative_path);

// The frame index beside a recording.
std::filesystem::path IndexPathOf(std::filesystem::path recording);

// "2026-03-01": the folder of the UTC day that holds the second.
std::string DayOf(std::int64_t second);

// Creates the file's folders below the mount. Never creates the mount itself: when it is missing, its disk is not
// mounted. Throws std::system_error.
void MakeFolderFor(const std::filesystem::path& mount, const FileName& name);

}  // namespace lookhaven::archive
