// SPDX-License-Identifier: Apache-2.0
//
// Writes one event while it is being recorded: its file, its row, its seconds in the recording log.
//
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "standalone/media/recording_writer.h"
#include "standalone/recorder/event_row_queue.h"
#include "standalone/recorder/frame_queue.h"

namespace lookhaven::recorder {

struct EventStart {
    int id = 0;
    int camera = 0;
    int mount_id = 0;
    std::filesystem::path mount;
    std::int64_t wall_ms = 0;       // of the first frame
    std::int64_t timestamp_us = 0;  // likewise
    int reason = base::kReasonContinuous;
};

class EventWriter {
  public:
    // Creates the file; the row is put into the queue once the first frames are on the disk. Throws std::exception;
    // then no file is left. The queue must outlive this object.
    EventWriter(const EventStart& start, const media::MediaFormat& format, EventRowQueue& rows);

    const EventStart& Start() const { return start_; }
    bool Takes(const Frame& frame) const { return writer_.Takes(frame.Packet()); }

    // Both throw std::exception when the disk fails; what was flushed before is kept. after_gap: the recording log has
    // nothing between the picture before and this one.
    void Write(const Frame& frame, bool after_gap = false);
    void Flush();
    // Finishes file and row with what is on the disk; also allowed after another call has thrown. Throws std::exception
    // when the file cannot be finished, and may be called again later then; until it succeeds the row is that of an
    // open event, which retention leaves alone.
    void Close();
    // Finishes the row alone, for a file that cannot be finished: retention may remove it, verify can repair it.
    void FinishRow();
    bool HasFrames() const { return writer_.FrameCount() > 0; }

  private:
    std::int64_t EndS() const;
    void NoteProgress();
    void PutRow();
    void LogSeconds();
    void Log(std::int64_t begin_s, std::int64_t end_s);

    const EventStart start_;
    EventRowQueue& rows_;
    store::Event row_;
    media::RecordingWriter writer_;
    // Seconds with footage: those before gaps that are still to be logged, then from footage_since_s_ on.
    struct Seconds {
        std::int64_t begin = 0;
        std::int64_t end = 0;
    };
    std::vector<Seconds> before_gaps_;
    std::int64_t footage_since_s_;
    std::int64_t newest_picture_s_;
    std::int64_t logged_until_s_;
};

}  // namespace lookhaven::recorder
