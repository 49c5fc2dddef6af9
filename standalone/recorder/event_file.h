// SPDX-License-Identifier: Apache-2.0
//
// One event as it is being recorded: its file, its row, its seconds in the recording log.
//
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

#include "standalone/media/recording_writer.h"
#include "standalone/recorder/event_ledger.h"
#include "standalone/recorder/frame_queue.h"

namespace lookhaven::recorder {

struct EventStart {
    int id = 0;
    int camera = 0;
    int mount_id = 0;
    std::filesystem::path mount;
    std::int64_t wall_ms = 0;       // of the first frame
    std::int64_t timestamp_us = 0;  // likewise
    int reason = store::kReasonContinuous;
};

class EventFile {
  public:
    // Makes the file; the row follows with the first frames on the disk. The ledger must outlive this object. Throws
    // std::exception; then no file is left.
    EventFile(const EventStart& start, const RunFormat& format, EventLedger& ledger);

    const EventStart& Start() const { return start_; }
    bool Takes(const Frame& frame) const { return writer_.Takes(frame.Packet()); }

    // These throw std::exception when the disk does not take it.
    void Write(const Frame& frame);
    void Flush();
    // Finishes file and row with what is on the disk, also after another call has thrown. Throws std::exception when the
    // file cannot be finished; its row says then what was flushed, and verify finishes the file.
    void Close();

  private:
    std::int64_t EndS() const;
    void NoteProgress();

    const EventStart start_;
    EventLedger& ledger_;
    store::Event row_;
    media::RecordingWriter writer_;
    std::int64_t logged_until_s_;
};

}  // namespace lookhaven::recorder
