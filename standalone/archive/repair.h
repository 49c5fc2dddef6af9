// SPDX-License-Identifier: Apache-2.0
//
// Finishes recordings that their writer could not finish.
#pragma once

#include <cstdint>
#include <filesystem>

#include "standalone/archive/frame_index.h"

namespace lookhaven::archive {

// What a recording holds.
struct Contents {
    IndexHeader header;
    int frame_count = 0;           // as RecordingReader's
    std::int64_t duration_ms = 0;  // including the last frame's time on the screen
    std::uint64_t size_bytes = 0;  // of the recording and its index
};

// Truncates the recording after its last complete cluster and makes its index list exactly what is there; a missing or
// damaged index is rebuilt, around clusters that are damaged. Does nothing to a recording that is finished and intact.
// frame_count is 0 when nothing can be saved; then the files are unchanged, and the caller may remove them. Throws
// std::system_error, EBUSY while the recording is still being written.
Contents CloseCrashed(const std::filesystem::path& recording);

}  // namespace lookhaven::archive
