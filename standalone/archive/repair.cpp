// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/repair.h"

#include <algorithm>
#include <optional>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/archive/mount_file.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/base/file.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

namespace {

struct Index {
    IndexHeader header;
    std::vector<FrameEntry> frames;
    bool is_finished = false;
    bool is_damaged = false;  // after the frames
};

// The readable part of the index; nothing when it is missing, no regular file, or even its header is damaged.
std::optional<Index> ReadIndex(const std::filesystem::path& path, std::uint64_t recording_bytes) {
    try {
        FrameIndexReader reader(path);
        if (reader.IsGrowing()) {
            throw std::system_error(std::make_error_code(std::errc::device_or_resource_busy), path.string());
        }
        Index index{reader.Header(), {}, reader.IsFinished(), false};
        try {
            reader.ReadNew(recording_bytes, index.frames);
        } catch (const ArchiveError&) {
            index.is_damaged = true;
        }
        return index;
    } catch (const ArchiveError&) {
        return std::nullopt;
    } catch (const std::system_error& error) {
        const bool is_link = error.code() == std::errc::too_many_symbolic_link_levels;
        if (is_link || error.code() == std::errc::no_such_file_or_directory) {
            return std::nullopt;
        }
        throw;
    }
}

std::uint64_t EndOf(const std::vector<FrameEntry>& frames) {
    return frames.empty() ? 0 : frames.back().offset + frames.back().size;
}

void ReplaceIndex(const std::filesystem::path& path, const IndexHeader& header, std::span<const FrameEntry> frames) {
    std::filesystem::path temporary = path;
    temporary += ".new";
    RemoveFile(temporary);
    try {
        FrameIndexWriter writer(temporary, header);
        writer.Append(frames);
        writer.Finish();
        RenameFile(temporary, path.filename());
    } catch (...) {
        RemoveFile(temporary);
        throw;
    }
}

Contents Summary(const IndexHeader& header, const std::vector<FrameEntry>& frames, std::uint64_t recording_bytes,
                 const std::filesystem::path& recording) {
    std::uint32_t last_ms = 0;
    for (const FrameEntry& frame : frames) {
        last_ms = std::max(last_ms, frame.time_ms);
    }
    const std::filesystem::path index_path = IndexPathOf(recording);
    return {header, RecordingReader(recording).FrameCount(),
            DurationMs(static_cast<std::int64_t>(frames.size()), last_ms),
            recording_bytes + SizeOf(OpenFile(index_path, O_RDONLY), index_path)};
}

// Every frame that can be decoded, and where they end.
struct Walk {
    IndexHeader header;
    std::vector<FrameEntry> frames;
    std::uint64_t end = 0;
};

std::optional<Walk> WalkRecording(int file) {
    try {
        MatroskaBlocks blocks(file);
        Walk walk{blocks.Header(), {}, 0};
        do {
            std::vector<FrameEntry> piece;
            while (blocks.ReadCluster(piece)) {
            }
            walk.end = blocks.Position();
            // Players begin at a key frame; after a damaged cluster, so do decoders.
            const auto first = std::ranges::find_if(piece, &FrameEntry::key);
            walk.frames.insert(walk.frames.end(), first, piece.end());
        } while (blocks.SkipDamage());
        return walk.frames.empty() ? std::nullopt : std::optional(std::move(walk));
    } catch (const ArchiveError&) {
        return std::nullopt;
    }
}

}  // namespace

Contents CloseCrashed(const std::filesystem::path& recording) {
    const std::filesystem::path index_path = IndexPathOf(recording);
    const base::FileDescriptor file = OpenFile(recording, O_RDWR);
    const std::uint64_t size = SizeOf(file, recording);
    const std::optional<Index> index = ReadIndex(index_path, size);
    if (index && index->is_finished && !index->is_damaged && !index->frames.empty()) {
        return Summary(index->header, index->frames, size, recording);
    }
    std::optional<Walk> walk = WalkRecording(file.Get());
    if (!walk) {
        return {};
    }
    // Fewer frames than the index lists means damage in the middle: the frames in and after it may still be there.
    if (index && !index->is_damaged &&
        (EndOf(index->frames) > EndOf(walk->frames) || index->frames.size() > walk->frames.size())) {
        walk->frames = index->frames;
        walk->end = size;
    }
    if (walk->end < size && ::ftruncate(file.Get(), static_cast<off_t>(walk->end)) != 0) {
        base::ThrowErrno("cannot truncate " + recording.string());
    }
    IndexHeader header = index ? index->header : walk->header;
    header.reason = index ? header.reason : base::kReasonContinuous;  // the file itself does not say
    ReplaceIndex(index_path, header, walk->frames);
    return Summary(header, walk->frames, std::min(size, walk->end), recording);
}

}  // namespace lookhaven::archive
