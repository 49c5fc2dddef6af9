// SPDX-License-Identifier: Apache-2.0
//
// Compares a finished recording with its index.
#pragma once

#include <cstdint>
#include <exception>
#include <filesystem>
#include <string>

namespace lookhaven::maintenance {

// Whether a recording and its index agree.
struct Inspection {
    std::string problem;  // empty when they agree
    bool is_growing = false;
    bool must_rebuild_index = false;  // the index claims to be complete, and is wrong
    // Damage in the middle; the frames after it, which the index names, may still be read.
    bool is_damaged_inside = false;
    std::int64_t frames = 0;
    std::int64_t shown_frames = 0;  // as players count them; when there is no problem
};

// Reads all of the file but its frames. A file that cannot be used is a problem, not a failure; throws
// std::system_error when the disk fails.
Inspection Inspect(const std::filesystem::path& recording);

// Whether it says something of the disk rather than of one file on it.
bool IsDiskFailure(const std::exception& failure);

}  // namespace lookhaven::maintenance
