// SPDX-License-Identifier: Apache-2.0
//
// A small file that stands for a stretch of footage in recordings of the same camera: the footage of an alarm or a sale.
//
//   lookhaven span 1
//   begin 1772352930000
//   end 1772352960000
//   recording 2026-03-01/081500-12.mkv
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "standalone/archive/archive_error.h"

namespace lookhaven::archive {

struct Span {
    std::int64_t begin_ms = 0;  // wall clock; [begin, end), which may lie ahead while the footage is being recorded
    std::int64_t end_ms = 0;
    std::vector<std::string> recordings;  // by time, as "<day>/<file>" below the camera's folder; may be none yet

    bool operator==(const Span&) const = default;
};

constexpr std::size_t kMaxSpanRecordings = 1024;

// Writes or replaces the file in one step. Throws std::system_error, ArchiveError for a span that cannot be read back.
void WriteSpan(const std::filesystem::path& path, const Span& span);

// Throws std::system_error when it cannot be read, ArchiveError when it is no span file. Names only what is a recording
// by layout.h, so nothing outside the camera's folder.
Span ReadSpan(const std::filesystem::path& path);

}  // namespace lookhaven::archive
