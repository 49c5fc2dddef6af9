// SPDX-License-Identifier: Apache-2.0
//
// The list of a recording's frames in a file of its own, so that any frame is found without reading those before it.
//
// Format        A header of 64 bytes, then 24 bytes per frame in file order, which is decoding order; all little
//               endian. Header and entries each carry a checksum. The header's last byte is 1 once the recording is
//               finished.
// Crash rule    An entry is appended after its frame is in the recording. A torn entry at the end is ignored. Until it
//               finishes, the writer holds a lock on the file that ends with its process, so a reader can tell a
//               growing recording from an abandoned one.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>
#include <vector>

#include "standalone/archive/archive_error.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

struct IndexHeader {
    std::string codec;        // "MJPEG", "H264", "H265"
    std::string audio_codec;  // "AAC", "PCMU", "PCMA", "OPUS"; empty when silent
    int width = 0;            // pixels
    int height = 0;
    std::int64_t start_wall_ms = 0;  // of the frame at 0 ms
    int reason = 0;                  // base::kReasonContinuous …

    bool operator==(const IndexHeader&) const = default;
};

// Whether it can be a recording's: codecs that are known, a size and a start that are possible. A reader refuses
// others.
bool IsPossible(const IndexHeader& header);

// Readers take a frame with a later time for damage.
constexpr std::uint32_t kMaxFrameTimeMs = (base::kMaxRecordingSeconds + 60) * 1000;

struct FrameEntry {
    std::uint64_t offset = 0;   // of the frame's first byte in the recording
    std::uint32_t size = 0;     // bytes, 1 … base::kMaxFrameBytes
    std::uint32_t time_ms = 0;  // presentation time, from the recording's start; at most kMaxFrameTimeMs
    bool key = false;           // decodable without the frames before it

    bool operator==(const FrameEntry&) const = default;
};

// The length of a recording including its last frame's time on the screen, which is taken to be the mean distance of
// frames, at most a second. last_time_ms: presentation time of the last frame. 0 without frames.
std::int64_t DurationMs(std::int64_t frame_count, std::int64_t last_time_ms);

class FrameIndexWriter {
  public:
    // Creates the file, which must not exist, and locks it. Throws std::system_error; then there is no file.
    FrameIndexWriter(const std::filesystem::path& path, const IndexHeader& header);

    // Appends the entries, whose frames must be in the recording already. Throws std::system_error; then the index is
    // unchanged.
    void Append(std::span<const FrameEntry> entries);

    // Marks the recording finished and releases the lock; nothing else may be called afterwards. Throws
    // std::system_error.
    void Finish();

    std::uint64_t SizeBytes() const { return size_bytes_; }

  private:
    std::string path_;
    base::FileDescriptor file_;
    std::uint64_t size_bytes_ = 0;
};

// Thread safety: one thread per reader; any number of readers beside the single writer, in any process.
class FrameIndexReader {
  public:
    // Throws std::system_error when the file cannot be opened, ArchiveError when it is no frame index.
    explicit FrameIndexReader(const std::filesystem::path& path);
    // Reads an open file; the path is for messages only.
    FrameIndexReader(base::FileDescriptor file, std::string path);

    const IndexHeader& Header() const { return header_; }

    // Appends the entries that were not read yet and whose frames lie within the recording's first recording_bytes, in
    // decoding order. Throws ArchiveError when the index is damaged; the entries before the damage are appended then.
    void ReadNew(std::uint64_t recording_bytes, std::vector<FrameEntry>& entries);

    // A living writer is still writing it.
    bool IsGrowing() const;
    // The writer has finished it in order. Both are false for a recording whose writer died.
    bool IsFinished() const;

  private:
    std::string path_;
    base::FileDescriptor file_;
    IndexHeader header_;
    std::uint64_t position_bytes_ = 0;
    std::uint64_t frames_end_ = 0;  // where the last frame that was read ends in the recording
};

}  // namespace lookhaven::archive
