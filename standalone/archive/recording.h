// SPDX-License-Identifier: Apache-2.0
//
// A recording, or a span of several, as one row of frames with their times.
//
// Why so        Players address frames by number and by time, and both must lead to the same frame for as long as the
//               recording grows.
// Invariants    (1) Frames are in the order in which they are shown, and no two have the same millisecond.
//               (2) TimeOf and IndexAt are exact inverses.
//               (3) What was offered once keeps its number.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "standalone/archive/frame_index.h"

namespace lookhaven::archive {

// One entry of the row. Where frames are more than a second apart, the earlier one is offered again each second, so that
// a player that counts in frames keeps moving.
struct RecordedFrame {
    std::uint32_t segment = 0;  // of the recordings that the row is made of
    std::uint32_t entry = 0;    // of the segment's entries
    std::int64_t time_ms = 0;   // from the row's start
};

class Recording {
  public:
    // Opens a recording (.mkv, with its index beside it) or a span (.span, whose recordings that are gone are left out).
    // Throws ArchiveError, std::system_error.
    explicit Recording(const std::filesystem::path& path);
    Recording(Recording&&) noexcept;
    ~Recording();

    // May be 0 while the recording grows.
    int FrameCount() const { return static_cast<int>(frames_.size()); }
    // Frames per second, 1 … 1000. Throws ArchiveError when there is no frame.
    double FrameRate() const;
    // More frames may come.
    bool Grows() const;
    // Takes in what was recorded since, and whether more may come. Throws as the constructor; then the row is unchanged.
    void Refresh();

    // The last frame at or before the time; -1 for a time below 0 and when there is no frame. Past the end the last
    // frame, and of a row that grows the number that the time would have.
    int IndexAt(std::int64_t time_ms) const;
    // The frame's time; past the end of a row that grows, the time it would have. An index outside the row otherwise
    // gives the first or the last frame's; 0 when there is no frame.
    std::int64_t TimeOf(int index) const;

    // The frame of a valid index. Valid until Refresh.
    const RecordedFrame& At(int index) const { return frames_.at(static_cast<std::size_t>(index)); }

    // Of the segment: what it is; its frames in the order of decoding, the first of them a key frame.
    const IndexHeader& Header(std::uint32_t segment) const;
    std::span<const FrameEntry> Entries(std::uint32_t segment) const;
    const std::filesystem::path& PathOf(std::uint32_t segment) const;
    // Reads a frame's bytes. The buffer is exactly as large as the frame. Throws ArchiveError when the recording has
    // become shorter, std::system_error. Works on after the recording was deleted.
    void ReadBytes(std::uint32_t segment, const FrameEntry& frame, std::span<std::uint8_t> buffer) const;

    // Wall clock of the row's start.
    std::int64_t StartWallMs() const { return start_wall_ms_; }

  private:
    class Segment;

    void OpenSegments();
    void Append(std::uint32_t segment);
    void Place(std::uint32_t segment, std::uint32_t entry, std::int64_t time_ms);
    void RepeatLast(std::int64_t before_ms);
    std::int64_t PeriodMs() const;

    std::filesystem::path path_;
    bool is_span_ = false;
    std::int64_t start_wall_ms_ = 0;
    std::int64_t end_wall_ms_ = 0;  // of a span
    std::size_t named_ = 0;         // recordings of the span that were looked for
    std::vector<std::unique_ptr<Segment>> segments_;
    std::size_t read_segments_ = 0;  // those that have ended and were read to the end
    std::vector<RecordedFrame> frames_;
    bool grows_ = false;
};

}  // namespace lookhaven::archive
