// SPDX-License-Identifier: Apache-2.0
//
// Writes one camera's frames into a Matroska file that is playable while it grows, with a frame index beside it.
//
// Crash rule    Twice a second what came is brought to the disk as a whole cluster, then its frames are appended to the
//               index. A kill or a power cut at any time loses what came since; archive::CloseCrashed tidies up.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <system_error>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// The recording cannot be written on: code() is ENOSPC or EDQUOT for a full disk, else what the disk reports.
class WriteError : public std::system_error {
  public:
    using std::system_error::system_error;
};

struct RecordingFormat {
    StreamFormat video;
    std::optional<StreamFormat> audio;
};

// Thread safety: one thread.
class RecordingWriter {
  public:
    // Makes the file and its index (archive::IndexPathOf), which must not exist; their folder must. start_wall_ms: wall
    // clock of the first key frame. reason: REC_METHOD. Throws WriteError; SourceError for formats that cannot be
    // written. Leaves no file behind when it throws.
    RecordingWriter(const std::filesystem::path& path, const RecordingFormat& format, std::int64_t start_wall_ms,
                    int reason);
    RecordingWriter(const RecordingWriter&) = delete;
    RecordingWriter& operator=(const RecordingWriter&) = delete;
    // Without Close the files stay as a crash would leave them.
    ~RecordingWriter();

    // The packet can go into this file. When not, close it and begin a new one.
    bool Takes(const Packet& packet) const;

    // Adds a packet that this file takes. Recording begins at the first key frame; what comes before it is left out.
    // May write to the disk and wait for it. Throws WriteError; then what was flushed is playable, and only Close and the
    // destructor may still be called.
    void Write(const Packet& packet);

    // Brings everything that came to the disk and into the index, as Write does by itself every half second; for a
    // viewer who wants the newest frames, and when no packet comes. Throws as Write.
    void Flush();

    // Flushes, writes what makes the file seekable for other programs, and marks the index finished. After a WriteError
    // it cuts off what is not whole and marks the index finished. Throws WriteError when that fails.
    void Close();

    // Of what was flushed.
    int FrameCount() const;
    std::uint64_t SizeBytes() const;  // of the recording and its index
    std::int64_t EndWallMs() const;   // when the last frame leaves the screen; the start while there is none

  private:
    class File;

    std::unique_ptr<File> file_;
};

}  // namespace lookhaven::media
