// SPDX-License-Identifier: Apache-2.0
//
// Copies a recording or a span into one Matroska file without re-encoding.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>

namespace lookhaven::media {

struct ExportOptions {
    bool with_sound = true;
    // Wall clock, in milliseconds; nothing: from the start, to the end. The copy begins at the last key frame at or
    // before begin_ms.
    std::optional<std::int64_t> begin_ms;
    std::optional<std::int64_t> end_ms;
    // For a receiver that must see whether the copy is whole: called before the first byte, once all is checked that
    // can be, with the number of bytes that the whole copy will have. A void element fills it up to that number.
    std::function<void(std::int64_t size_bytes)> announce = {};
};

// Copies the recording (.mkv or .span) to the descriptor, which need not be seekable: the copy starts at once and keeps
// at most a second of footage in memory. Into a regular file it also writes a seek table. Of a growing recording it
// copies what is there, and does not wait for more. Throws SourceError, archive::ArchiveError, std::system_error (EPIPE
// when the receiver has disconnected).
void Export(const std::filesystem::path& recording, int output, const ExportOptions& options);

}  // namespace lookhaven::media
