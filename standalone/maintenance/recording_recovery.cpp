// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/recording_recovery.h"

#include <algorithm>
#include <array>

#include <fcntl.h>

#include "standalone/archive/matroska_blocks.h"
#include "standalone/archive/mount_file.h"

namespace lookhaven::maintenance {

namespace {

// At least a whole second: a search never finds an event without a duration.
std::int64_t EndOf(std::int64_t start_s, std::int64_t duration_ms) {
    const std::int64_t seconds = std::clamp<std::int64_t>((duration_ms + 999) / 1000, 1, base::kMaxRecordingSeconds);
    return start_s + seconds;
}

// Empty, or headers in our format without a frame: no other program leaves such a file.
bool HasNoFrame(const std::filesystem::path& recording) {
    const base::FileDescriptor file = archive::OpenFile(recording, O_RDONLY);
    if (archive::SizeOf(file, recording) == 0) {
        return true;
    }
    try {
        std::vector<archive::FrameEntry> frames;
        archive::MatroskaBlocks blocks(file.Get());
        return !blocks.ReadCluster(frames);
    } catch (const archive::ArchiveError&) {
        return false;
    }
}

// Removes a file without a frame if it is certainly ours.
std::string Discard(const MountFolder& mount, const archive::FileName& name) {
    const std::string path = (mount.Path() / archive::PathOf(name)).string();
    if (!HasNoFrame(path)) {
        return "left " + path + " alone: it holds no recording of ours";
    }
    mount.Remove(name);
    return "removed " + path + ", which holds no frame";
}

}  // namespace

store::Event RowOf(const archive::FileName& name, int mount_id, const archive::Contents& contents) {
    const archive::IndexHeader& header = contents.header;
    store::Event row;
    row.id = name.event;
    row.camera_id = name.camera;
    row.mount_id = mount_id;
    row.start_s = name.start_s;
    row.end_s = EndOf(name.start_s, contents.duration_ms);
    row.reason = header.reason == base::kReasonAlarm ? base::kReasonAlarm : base::kReasonContinuous;
    row.frame_count = contents.frame_count;
    row.size_bytes = static_cast<std::int64_t>(contents.size_bytes);
    row.video_type = base::CodecNamed(header.codec).value_or(base::Codec::kMjpeg);
    row.audio_codec = header.audio_codec;
    row.width = header.width;
    row.height = header.height;
    row.path = archive::PathOf(name);
    return row;
}

std::string CloseEvent(store::Events& events, const MountFolder& mount, const store::Event& row) {
    const std::filesystem::path path = mount.Path() / row.path;
    const std::optional<archive::FileName> name = archive::ParsePath(row.path);
    if (!name || !mount.Has(*name)) {
        events.Remove(std::array{row.id});
        return "removed event " + std::to_string(row.id) + ", whose file " + path.string() + " is missing";
    }
    const archive::Contents contents = archive::CloseCrashed(path);
    if (contents.frame_count == 0) {
        std::string done = Discard(mount, *name);
        events.Remove(std::array{row.id});
        return done;
    }
    const store::Event whole = RowOf(*name, row.mount_id, contents);
    events.Finish(row.id, whole.end_s, whole.frame_count, whole.size_bytes);
    return "closed " + path.string() + " after its last good frame";
}

std::string ImportRecording(store::Events& events, const MountFolder& mount, int mount_id,
                            const archive::FileName& name, int new_id, int keep_below) {
    const archive::Contents contents = archive::CloseCrashed(mount.Path() / archive::PathOf(name));
    const std::optional<store::Event> present = events.Find(name.event);
    const std::optional<std::string> pending = events.PathPendingDeletion(name.event);
    if (IsRowOf(present, name) || pending == archive::PathOf(name)) {
        return "its event has come meanwhile";
    }
    if (contents.frame_count == 0) {
        return Discard(mount, name);
    }
    if (!present && !pending && name.event < keep_below) {
        events.Begin(RowOf(name, mount_id, contents));
        return "imported " + (mount.Path() / archive::PathOf(name)).string();
    }
    archive::FileName renamed = name;
    renamed.event = new_id;
    if (!mount.Renumber(name, new_id)) {
        return "left " + archive::PathOf(name) + " alone: a file with its new id exists already";
    }
    store::Event row = RowOf(renamed, mount_id, contents);
    row.order = events.OrderForDate(mount_id, row.start_s);
    events.Begin(row);
    return "imported " + (mount.Path() / row.path).string();
}

bool IsRowOf(const std::optional<store::Event>& row, const archive::FileName& name) {
    return row && row->path == archive::PathOf(name);
}

}  // namespace lookhaven::maintenance
