// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/event_writer.h"

#include <algorithm>
#include <exception>
#include <utility>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/archive/recording_reader.h"

namespace lookhaven::recorder {

namespace {

store::Event RowOf(const EventStart& start, const media::MediaFormat& format) {
    store::Event row;
    row.id = start.id;
    row.camera_id = start.camera;
    row.mount_id = start.mount_id;
    row.start_s = start.wall_ms / 1000;
    row.recording = true;
    row.reason = start.reason;
    row.video_type = format.video.codec;
    row.audio_codec = format.audio ? base::CodecName(format.audio->codec) : "";
    row.width = format.video.width;
    row.height = format.video.height;
    row.path = archive::PathOf({start.camera, row.start_s, start.id, archive::FileKind::kRecording});
    return row;
}

// A finished recording's frames as players count them: where pictures are far apart, one is repeated each second.
int ShownFrames(const std::filesystem::path& recording, int written) {
    try {
        const archive::RecordingReader reader(recording);
        return reader.Grows() ? written : reader.FrameCount();
    } catch (const std::exception&) {
        return written;  // verify puts it right
    }
}

std::filesystem::path PathWithFolder(const EventStart& start, const store::Event& row) {
    archive::MakeFolderFor(start.mount, {start.camera, row.start_s, start.id, archive::FileKind::kRecording});
    return start.mount / row.path;
}

}  // namespace

EventWriter::EventWriter(const EventStart& start, const media::MediaFormat& format, EventRowQueue& rows)
    : start_(start),
      rows_(rows),
      row_(RowOf(start, format)),
      writer_(PathWithFolder(start, row_), format, start.wall_ms, start.reason),
      footage_since_s_(row_.start_s),
      newest_picture_s_(row_.start_s),
      logged_until_s_(row_.start_s) {}

void EventWriter::Write(const Frame& frame, bool after_gap) {
    if (frame.medium == base::Medium::kVideo) {
        const std::int64_t picture_s = (start_.wall_ms + (frame.timestamp_us - start_.timestamp_us) / 1000) / 1000;
        if (after_gap) {
            before_gaps_.push_back({footage_since_s_, newest_picture_s_ + 1});
            footage_since_s_ = picture_s;
        }
        newest_picture_s_ = std::max(newest_picture_s_, picture_s);
    }
    writer_.Write(frame.Packet());
    NoteProgress();
}

void EventWriter::Flush() {
    writer_.Flush();
    NoteProgress();
}

void EventWriter::Close() {
    writer_.Close();
    FinishRow();
    LogSeconds();
}

// Once, for retention may remove the event from then on.
void EventWriter::FinishRow() {
    if (std::exchange(row_.recording, false)) {
        PutRow();
    }
}

// Rounded up to whole seconds, at least one: a search never finds an event without a duration.
std::int64_t EventWriter::EndS() const {
    const std::int64_t end_s = (writer_.EndWallMs() + 999) / 1000;
    return std::clamp(end_s, row_.start_s + 1, row_.start_s + base::kMaxRecordingSeconds);
}

void EventWriter::NoteProgress() {
    if (writer_.FrameCount() != row_.frame_count) {
        PutRow();
        LogSeconds();
    }
}

void EventWriter::PutRow() {
    row_.frame_count =
        row_.recording ? writer_.FrameCount() : ShownFrames(start_.mount / row_.path, writer_.FrameCount());
    row_.size_bytes = static_cast<std::int64_t>(writer_.SizeBytes());
    row_.end_s = EndS();
    if (row_.frame_count > 0) {
        rows_.Put(row_);
    }
}

void EventWriter::LogSeconds() {
    if (row_.frame_count > 0) {
        for (const Seconds& seconds : before_gaps_) {
            Log(seconds.begin, seconds.end);
        }
        before_gaps_.clear();
        Log(footage_since_s_, row_.end_s);
    }
}

void EventWriter::Log(std::int64_t begin_s, std::int64_t end_s) {
    begin_s = std::max(begin_s, logged_until_s_);
    if (begin_s < end_s) {
        archive::WriteRecordingLog(start_.mount / std::to_string(start_.camera), begin_s, end_s,
                                   static_cast<std::uint8_t>(start_.reason));
        logged_until_s_ = end_s;
    }
}

}  // namespace lookhaven::recorder
