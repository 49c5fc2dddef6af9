// SPDX-License-Identifier: Apache-2.0
//
// A small file that refers to a period of footage in recordings of one camera: the footage of an alert or a POS
// transaction.
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
    // Wall clock; [begin, end), which may be in the future while the footage is being recorded.
    std::int64_t begin_ms = 0;
    std::int64_t end_ms = 0;
    std::vector<std::string> recordings;  // in order of time, as "<day>/<file>" below the camera's folder; may be empty

    bool operator==(const Span&) const = default;
};

constexpr std::size_t kMaxSpanRecordings = 1024;

// Writes or replaces the file atomically. Throws std::system_error; ArchiveError, before writing, for a span that
// ReadSpan would reject.
void WriteSpan(const std::filesystem::path& path, const Span& span);

// Throws std::system_error when the file cannot be read, ArchiveError when it is no span file. Every name in the result
// is a recording's by layout.h, so none leads out of the camera's folder.
Span ReadSpan(const std::filesystem::path& path);

}  // namespace lookhaven::archive
