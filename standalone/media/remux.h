// SPDX-License-Identifier: Apache-2.0
//
// Copies a recording or a span into one Matroska file, without coding anything anew.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>

namespace lookhaven::media {

struct ExportOptions {
    bool with_sound = true;
    // Wall clock milliseconds; nothing: from the start, to the end. The copy begins at the key frame at or before.
    std::optional<std::int64_t> begin_ms;
    std::optional<std::int64_t> end_ms;
};

// Copies the recording (.mkv or .span) to the descriptor, which need not be seekable: the copy starts at once and holds
// no more than a second of footage in memory. A descriptor of a regular file makes a file with a seek table. Of a
// recording that grows it copies what is there. Throws SourceError, archive::ArchiveError, std::system_error (EPIPE when
// the receiver has left).
void Export(const std::filesystem::path& recording, int output, const ExportOptions& options);

}  // namespace lookhaven::media
