// SPDX-License-Identifier: Apache-2.0
//
// Writes one camera's frames into a Matroska file that is playable while it grows, with a frame index beside it.
//
// Crash rule    Twice a second the frames added since are synced to the disk as a whole cluster, then appended to the
//               index. A kill or a power cut at any time loses what was added after that; archive::CloseCrashed cleans
//               up.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

class ContainerOutput;

// The recording cannot be written on: code() is ENOSPC or EDQUOT for a full disk, else what the disk reports.
class WriteError : public std::system_error {
  public:
    // why: the whole sentence, to which the code's own text would only add what it says already.
    WriteError(std::error_code code, std::string why) : std::system_error(code), why_(std::move(why)) {}

    const char* what() const noexcept override { return why_.c_str(); }

  private:
    std::string why_;
};

// Thread safety: one thread.
class RecordingWriter {
  public:
    // Creates the file and its index (archive::IndexPathOf), neither of which may exist; their folder must.
    // start_wall_ms: wall clock of the first key frame, in milliseconds. reason: base::kReasonContinuous or
    // kReasonAlarm. Throws WriteError; SourceError for formats that cannot be written. Leaves no file behind when it
    // throws.
    RecordingWriter(const std::filesystem::path& path, const MediaFormat& format, std::int64_t start_wall_ms,
                    int reason);
    RecordingWriter(const RecordingWriter&) = delete;
    RecordingWriter& operator=(const RecordingWriter&) = delete;
    // Without Close the files stay as a crash would leave them.
    ~RecordingWriter();

    // Whether the packet can go into this file: same formats, not too long. If not, close it and begin a new one.
    bool Takes(const Packet& packet) const;

    // Adds a packet that this file takes. Recording begins at the first key frame; packets before it are dropped. Every
    // half second this writes to the disk and waits for it. Throws WriteError; then what was flushed is playable, and
    // only Close and the destructor may still be called.
    void Write(const Packet& packet);

    // Writes everything added so far to the disk and into the index, as Write does by itself every half second; for a
    // viewer who wants the newest frames, and when no packet comes. Throws as Write.
    void Flush();

    // Flushes, writes what makes the file seekable for other programs, and marks the index finished. Clusters that the
    // disk does not take, or did not take whole before, are cut off, with a warning in the log; a recording without a
    // frame is removed. Throws WriteError when the file cannot even be finished so; call it again later then. Also
    // allowed after it succeeded.
    void Close();

    // The frames that were flushed.
    int FrameCount() const { return frame_count_; }
    std::uint64_t SizeBytes() const { return end_bytes_ + index_->SizeBytes(); }  // of the recording and its index
    // When the last frame leaves the screen; the start while there is none.
    std::int64_t EndWallMs() const { return start_wall_ms_ + archive::DurationMs(frame_count_, latest_ms_); }

  private:
    void Create(const std::filesystem::path& path, int reason);
    template <class Step>
    void WriteOrFail(Step step);
    void End();
    void IndexWholeClusters();
    void Remove() const;
    void Sync();
    void AppendToIndex();

    const std::string path_;
    const MediaFormat format_;
    const std::int64_t start_wall_ms_;
    base::FileDescriptor file_;
    std::unique_ptr<ContainerOutput> output_;
    int video_ = -1;  // streams of the output
    int audio_ = -1;
    // What Create makes; never empty afterwards.
    std::optional<archive::MatroskaBlocks> blocks_;
    std::optional<archive::FrameIndexWriter> index_;
    std::optional<std::int64_t> begin_us_;  // capture time of the first key frame
    std::int64_t flushed_us_;
    bool is_pending_ = false;
    bool has_failed_ = false;
    bool is_index_final_ = false;  // after a failure: what is not in it by now is cut off
    bool is_finished_ = false;
    int frame_count_ = 0;
    std::int64_t latest_ms_ = 0;
    std::vector<archive::FrameEntry> unindexed_;  // of whole clusters, up to the position of blocks_
    std::uint64_t end_bytes_ = 0;                 // of the last whole cluster that is indexed
};

}  // namespace lookhaven::media
