// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/event_file.h"

#include <algorithm>
#include <utility>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"

namespace lookhaven::recorder {

namespace {

store::VideoType TypeOf(media::Codec codec) {
    return codec == media::Codec::kH264   ? store::VideoType::kH264
           : codec == media::Codec::kH265 ? store::VideoType::kH265
                                          : store::VideoType::kMjpeg;
}

store::Event RowOf(const EventStart& start, const RunFormat& format) {
    store::Event row;
    row.id = start.id;
    row.camera_id = start.camera;
    row.mount_id = start.mount_id;
    row.start_s = start.wall_ms / 1000;
    row.recording = true;
    row.reason = start.reason;
    row.video_type = TypeOf(format.video.codec);
    row.audio_codec = format.audio ? media::CodecName(format.audio->codec) : "";
    row.width = format.video.width;
    row.height = format.video.height;
    row.path = archive::PathOf({start.camera, row.start_s, start.id, archive::FileKind::kRecording});
    return row;
}

std::filesystem::path PathWithFolder(const EventStart& start, const store::Event& row) {
    archive::MakeFolderFor(start.mount, {start.camera, row.start_s, start.id, archive::FileKind::kRecording});
    return start.mount / row.path;
}

}  // namespace

EventFile::EventFile(const EventStart& start, const RunFormat& format, EventLedger& ledger)
    : start_(start),
      ledger_(ledger),
      row_(RowOf(start, format)),
      writer_(PathWithFolder(start, row_), {format.video, format.audio}, start.wall_ms, start.reason),
      logged_until_s_(row_.start_s) {}

void EventFile::Write(const Frame& frame) {
    writer_.Write(frame.Packet());
    NoteProgress();
}

void EventFile::Flush() {
    writer_.Flush();
    NoteProgress();
}

void EventFile::Close() {
    row_.recording = false;
    try {
        writer_.Close();
    } catch (...) {
        NoteProgress();
        throw;
    }
    NoteProgress();
}

// The last second that was begun counts whole, and an event lasts one at least: what takes no time is never found.
std::int64_t EventFile::EndS() const {
    const std::int64_t end_s = (writer_.EndWallMs() + 999) / 1000;
    return std::clamp(end_s, row_.start_s + 1, row_.start_s + store::kMaxEventSeconds);
}

void EventFile::NoteProgress() {
    if (writer_.FrameCount() == row_.frame_count && row_.recording) {
        return;
    }
    row_.frame_count = writer_.FrameCount();
    row_.size_bytes = static_cast<std::int64_t>(writer_.SizeBytes());
    row_.end_s = EndS();
    if (row_.frame_count > 0) {
        ledger_.Put(row_);
    }
    if (row_.end_s > logged_until_s_ && row_.frame_count > 0) {
        const std::int64_t begin_s = std::exchange(logged_until_s_, row_.end_s);
        archive::WriteRecordingLog(start_.mount / std::to_string(start_.camera), begin_s, row_.end_s,
                                   static_cast<std::uint8_t>(start_.reason));
    }
}

}  // namespace lookhaven::recorder
