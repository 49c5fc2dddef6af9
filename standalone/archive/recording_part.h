// SPDX-License-Identifier: Apache-2.0
//
// The part of a recording that lies in a span of time, found by its index alone.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <vector>

#include "standalone/archive/frame_index.h"

namespace lookhaven::archive {

// No frame for longer than this is a gap.
constexpr std::int64_t kMinGapMs = 2000;

// Wall clock, in milliseconds.
struct TimeSpan {
    std::int64_t begin_ms = 0;
    std::int64_t end_ms = 0;

    bool operator==(const TimeSpan&) const = default;
};

// Times from the recording's own start.
struct RecordingPart {
    std::filesystem::path path = {};
    IndexHeader header = {};
    std::int64_t begin_ms = 0;        // of a key frame: the last one at or before the span
    std::int64_t last_ms = 0;         // of the last frame
    std::int64_t frames = 0;          // in between, both included
    std::int64_t source_bytes = 0;    // of the stretch of the recording that has to be read
    std::vector<TimeSpan> gaps = {};  // between its frames

    std::int64_t FirstWallMs() const { return header.start_wall_ms + begin_ms; }
    std::int64_t LastWallMs() const { return header.start_wall_ms + last_ms; }
};

// The recording's part in the span, whose bounds default to its start and end; of a growing recording, what there is
// now. Nothing when it has no frame in the span. Throws std::system_error when recording or index cannot be opened,
// ArchiveError.
std::optional<RecordingPart> PartOf(const std::filesystem::path& recording, std::optional<std::int64_t> begin_wall_ms,
                                    std::optional<std::int64_t> end_wall_ms);

// The frames of the part in decoding order.
std::vector<FrameEntry> FramesOf(const RecordingPart& part);

}  // namespace lookhaven::archive
