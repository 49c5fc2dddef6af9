// SPDX-License-Identifier: Apache-2.0
//
// Reads a recording, or a span of several, as one sequence of frames with their times.
//
// Why so        Players address frames by index and by time, and both must lead to the same frame while the recording
//               grows.
// Invariants    (1) Frames are in presentation order, and no two have the same millisecond.
//               (2) TimeOf and IndexAt are exact inverses.
//               (3) A frame that was returned once keeps its index.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "standalone/archive/frame_index.h"

namespace lookhaven::archive {

// Where frames are more than a second apart, the earlier one is repeated each second, so that a player that counts in
// frames keeps moving.
struct RecordedFrame {
    std::uint32_t segment = 0;  // which of the span's recordings; 0 for a single recording
    std::uint32_t entry = 0;    // which of the segment's entries
    std::int64_t time_ms = 0;   // from the start of the recording or span
};

class RecordingReader {
  public:
    // Opens a recording (.mkv, with its index beside it) or a span (.span; recordings that were deleted are skipped).
    // Throws ArchiveError, std::system_error.
    explicit RecordingReader(const std::filesystem::path& path);
    RecordingReader(RecordingReader&&) noexcept;
    ~RecordingReader();

    // May be 0 while the recording grows.
    int FrameCount() const { return static_cast<int>(frames_.size()); }
    // Frames per second, 1 … 1000. Throws ArchiveError when there is no frame.
    double FrameRate() const;
    // More frames may come.
    bool Grows() const;
    // Reads what was recorded since, and whether more may come. Throws as the constructor does; then nothing has
    // changed.
    void Refresh();

    // The last frame at or before the time; -1 for a negative time and when there is no frame. Past the end: the last
    // frame, or while it grows the index that the time will have at the present rate.
    int IndexAt(std::int64_t time_ms) const;
    // The frame's time. Past the end: the last frame's time, or while it grows the time that the index will have at the
    // present rate. A negative index gives the first frame's; 0 when there is no frame.
    std::int64_t TimeOf(int index) const;

    // Wall clock, in milliseconds, at which the frame of a valid index was captured. One that is repeated keeps its
    // own; otherwise it ascends, unless the clock was set back between two recordings of a span.
    std::int64_t CapturedMs(int index) const;

    // The frame of a valid index. Valid until Refresh.
    const RecordedFrame& At(int index) const { return frames_.at(static_cast<std::size_t>(index)); }

    // One segment: its entries are in decoding order and begin with a key frame.
    const IndexHeader& Header(std::uint32_t segment) const;
    std::span<const FrameEntry> Entries(std::uint32_t segment) const;
    const std::filesystem::path& PathOf(std::uint32_t segment) const;
    // The open recording; borrowed.
    int DescriptorOf(std::uint32_t segment) const;
    // The entry of the key frame with which decoding begins that is to lead to that entry: frames that follow a key
    // frame but are shown before it may depend on those before it.
    std::uint32_t KeyEntryOf(std::uint32_t segment, std::uint32_t entry) const;
    // Reads a frame's bytes; the buffer is exactly as large as the frame. Throws ArchiveError when the recording was
    // truncated, std::system_error. Also works after the recording was deleted.
    void ReadBytes(std::uint32_t segment, const FrameEntry& frame, std::span<std::uint8_t> buffer) const;

    // Wall clock, in milliseconds, of time 0.
    std::int64_t StartWallMs() const { return start_wall_ms_; }

  private:
    class Segment;

    void OpenSegments();
    void Append(std::uint32_t segment);
    void Place(std::uint32_t segment, std::uint32_t entry, std::int64_t time_ms);
    void RepeatLast(std::int64_t before_ms);
    void RepeatUntilNow(std::int64_t newest_before_ms);
    std::int64_t PeriodMs() const;

    std::filesystem::path path_;
    bool is_span_ = false;
    std::int64_t start_wall_ms_ = 0;
    std::int64_t end_wall_ms_ = 0;  // of a span
    std::size_t named_ = 0;         // how many of the span's recordings were opened or found deleted
    std::vector<std::unique_ptr<Segment>> segments_;
    std::size_t read_segments_ = 0;  // those that are finished and completely read
    std::vector<RecordedFrame> frames_;
    std::int64_t newest_ms_ = -1;  // time of the last frame that is no repetition
    std::int64_t newest_us_ = 0;   // when it was first seen, by the monotonic clock
    bool grows_ = false;
};

}  // namespace lookhaven::archive
