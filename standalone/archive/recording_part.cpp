// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/recording_part.h"

#include <algorithm>

#include <fcntl.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"

namespace lookhaven::archive {

namespace {

// Reading begins in the cluster of the first frame, which began at most a second before it.
constexpr std::int64_t kMaxClusterMs = 2000;

std::vector<FrameEntry> ReadEntries(FrameIndexReader& index, const std::filesystem::path& recording) {
    std::vector<FrameEntry> entries;
    index.ReadNew(SizeOf(OpenFile(recording, O_RDONLY), recording), entries);
    return entries;
}

std::int64_t SourceBytes(const RecordingPart& part, const std::vector<FrameEntry>& entries) {
    std::uint64_t from = 0;
    std::uint64_t to = 0;
    for (const FrameEntry& entry : entries) {
        from = entry.time_ms + kMaxClusterMs < part.begin_ms ? std::max(from, entry.offset) : from;
        to = entry.time_ms <= part.last_ms ? std::max(to, entry.offset + entry.size) : to;
    }
    return static_cast<std::int64_t>(to - std::min(from, to));
}

void FindGaps(RecordingPart& part, const std::vector<FrameEntry>& entries) {
    std::vector<std::int64_t> times;
    times.reserve(entries.size());
    for (const FrameEntry& entry : entries) {
        if (entry.time_ms >= part.begin_ms && entry.time_ms <= part.last_ms) {
            times.push_back(entry.time_ms);
        }
    }
    std::ranges::sort(times);
    part.frames = std::ssize(times);
    for (std::size_t i = 1; i < times.size(); ++i) {
        if (times[i] - times[i - 1] > kMinGapMs) {
            part.gaps.push_back({part.header.start_wall_ms + times[i - 1], part.header.start_wall_ms + times[i]});
        }
    }
}

}  // namespace

std::optional<RecordingPart> PartOf(const std::filesystem::path& recording, std::optional<std::int64_t> begin_wall_ms,
                                    std::optional<std::int64_t> end_wall_ms) {
    FrameIndexReader index(IndexPathOf(recording));
    const std::vector<FrameEntry> entries = ReadEntries(index, recording);
    const std::int64_t start_ms = index.Header().start_wall_ms;
    const std::int64_t begin_ms = begin_wall_ms.value_or(start_ms) - start_ms;
    RecordingPart part{.path = recording, .header = index.Header(), .begin_ms = 0, .last_ms = -1};
    bool has_frame = false;
    std::int64_t decoded_ms = -1;  // the latest of what is decoded so far, which later frames may be made from
    for (const FrameEntry& entry : entries) {
        decoded_ms = std::max<std::int64_t>(decoded_ms, entry.time_ms);
        if (entry.key && entry.time_ms <= std::max<std::int64_t>(begin_ms, 0)) {
            part.begin_ms = entry.time_ms;
        }
        if (!end_wall_ms || start_ms + entry.time_ms < *end_wall_ms) {
            part.last_ms = decoded_ms;
            has_frame |= entry.time_ms >= begin_ms;
        }
    }
    if (!has_frame) {
        return std::nullopt;
    }
    part.source_bytes = SourceBytes(part, entries);
    FindGaps(part, entries);
    return part;
}

std::vector<FrameEntry> FramesOf(const RecordingPart& part) {
    FrameIndexReader index(IndexPathOf(part.path));
    std::vector<FrameEntry> entries = ReadEntries(index, part.path);
    std::erase_if(entries, [&](const FrameEntry& entry) {
        return entry.time_ms < part.begin_ms || entry.time_ms > part.last_ms;
    });
    return entries;
}

}  // namespace lookhaven::archive
