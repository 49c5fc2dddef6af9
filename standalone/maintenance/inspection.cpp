// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/inspection.h"

#include <algorithm>
#include <cerrno>
#include <initializer_list>
#include <system_error>
#include <vector>

#include <fcntl.h>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/layout.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/archive/mount_file.h"
#include "standalone/archive/recording_reader.h"

namespace lookhaven::maintenance {

namespace {

using Frames = std::vector<archive::FrameEntry>;

bool IsCode(const std::exception& failure, std::initializer_list<int> codes) {
    const auto* error = dynamic_cast<const std::system_error*>(&failure);
    return error != nullptr && std::ranges::find(codes, error->code().value()) != codes.end();
}

Frames WalkRecording(const std::filesystem::path& path) {
    const base::FileDescriptor file = archive::OpenFile(path, O_RDONLY);
    Frames frames;
    archive::MatroskaBlocks blocks(file.Get());
    while (blocks.ReadCluster(frames)) {
    }
    frames.erase(frames.begin(), std::ranges::find_if(frames, &archive::FrameEntry::key));
    return frames;
}

}  // namespace

bool IsDiskFailure(const std::exception& failure) {
    return dynamic_cast<const std::system_error*>(&failure) != nullptr &&
           !IsCode(failure, {ENOENT, ENOTDIR, ELOOP, EBUSY, EEXIST});
}

Inspection Inspect(const std::filesystem::path& path) {
    Inspection result;
    Frames indexed;
    try {
        archive::FrameIndexReader index(archive::IndexPathOf(path));
        result.is_growing = index.IsGrowing();
        if (result.is_growing) {
            return result;
        }
        index.ReadNew(archive::SizeOf(archive::OpenFile(path, O_RDONLY), path), indexed);
        if (!index.IsFinished()) {
            result.problem = "the recording " + path.string() + " was never closed";
            return result;
        }
    } catch (const std::exception& failure) {
        if (IsDiskFailure(failure)) {
            throw;
        }
        result.problem = std::string("an index cannot be used: ") + failure.what();
        result.must_rebuild_index = true;
        return result;
    }
    result.frames = static_cast<std::int64_t>(indexed.size());
    Frames found;
    try {
        found = WalkRecording(path);
    } catch (const archive::ArchiveError& failure) {
        result.problem = "the recording " + path.string() + " cannot be read: " + failure.what();
    }
    if (found == indexed && result.problem.empty()) {
        result.shown_frames = archive::RecordingReader(path).FrameCount();
        return result;
    }
    result.is_damaged_inside = found.size() < indexed.size() && std::equal(found.begin(), found.end(), indexed.begin());
    result.must_rebuild_index = !result.is_damaged_inside;
    if (result.problem.empty()) {
        result.problem = result.is_damaged_inside ? "the recording " + path.string() + " is damaged after frame " +
                                                        std::to_string(found.size())
                                                  : "the index of " + path.string() + " does not name its frames";
    }
    return result;
}

}  // namespace lookhaven::maintenance
