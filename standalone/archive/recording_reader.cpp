// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/recording_reader.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

namespace {

constexpr std::int64_t kMaxFrameMs = 1000;
// A frame is in the index within this time, unless the disk is in trouble.
constexpr std::int64_t kMaxIndexDelayMs = 3000;
// Without a frame for longer than this, a recording has been ended: a longer silence is a step of the clock.
constexpr std::int64_t kMaxSilenceMs = 15'000;
// H.264 and H.265 reorder a frame across no more than this many others.
constexpr std::size_t kMaxReordered = 16;

}  // namespace

// One file, and its frames in decoding order.
class RecordingReader::Segment {
  public:
    Segment(std::filesystem::path path, std::optional<std::int64_t> base_ms)
        : path_(std::move(path)),
          file_(OpenFile(path_, O_RDONLY)),
          index_(IndexPathOf(path_)),
          base_ms_(base_ms) {}

    // Reads what was appended. Returns the entries whose place in presentation order is final, in that order.
    std::vector<std::uint32_t> Refresh() {
        // First, so that a writer that finishes in between causes another read, not a loss.
        grows_ = index_.IsGrowing();
        struct stat status {};
        if (::fstat(file_.Get(), &status) != 0) {
            base::ThrowErrno("cannot read " + path_.string());
        }
        const std::size_t before = ReadNew(static_cast<std::uint64_t>(status.st_size));
        waiting_.reserve(waiting_.size() + entries_.size() - before);
        for (std::size_t i = before; i < entries_.size(); ++i) {
            reorders_ |= entries_[i].time_ms < latest_ms_;
            latest_ms_ = std::max(latest_ms_, entries_[i].time_ms);
            waiting_.push_back(static_cast<std::uint32_t>(i));
        }
        if (reorders_) {
            const auto time = [&](std::uint32_t entry) { return entries_[entry].time_ms; };
            std::stable_sort(waiting_.begin(), waiting_.end(), [&](auto a, auto b) { return time(a) < time(b); });
        }
        const std::size_t kept = grows_ && reorders_ ? std::min(kMaxReordered, waiting_.size()) : 0;
        if (kept == 0) {
            return std::exchange(waiting_, {});
        }
        std::vector<std::uint32_t> placed(waiting_.begin(), waiting_.end() - static_cast<std::ptrdiff_t>(kept));
        waiting_.erase(waiting_.begin(), waiting_.begin() + static_cast<std::ptrdiff_t>(placed.size()));
        return placed;
    }

    void ReadBytes(const FrameEntry& frame, std::span<std::uint8_t> buffer) const {
        const std::optional<std::size_t> got = base::ReadAllAt(file_.Get(), buffer.data(), buffer.size(), frame.offset);
        if (!got) {
            base::ThrowErrno("cannot read " + path_.string());
        }
        if (*got < buffer.size()) {
            throw ArchiveError(path_.string() + " has become shorter");
        }
    }

    const std::filesystem::path& Path() const { return path_; }
    int Descriptor() const { return file_.Get(); }
    const IndexHeader& Header() const { return index_.Header(); }
    std::span<const FrameEntry> Entries() const { return entries_; }
    bool Grows() const { return grows_; }
    std::int64_t LatestWallMs() const { return Header().start_wall_ms + latest_ms_; }
    // Where the segment's 0 ms is in the whole. Fixed by the first call.
    std::int64_t BaseMs(std::int64_t unless_known) {
        base_ms_ = base_ms_.value_or(unless_known);
        return *base_ms_;
    }

  private:
    std::size_t ReadNew(std::uint64_t size) {
        const std::size_t before = entries_.size();
        index_.ReadNew(size, entries_);
        return before;
    }

    std::filesystem::path path_;
    base::FileDescriptor file_;
    FrameIndexReader index_;
    std::optional<std::int64_t> base_ms_;
    std::vector<FrameEntry> entries_;
    std::vector<std::uint32_t> waiting_;
    std::uint32_t latest_ms_ = 0;
    bool reorders_ = false;
    bool grows_ = false;
};

RecordingReader::RecordingReader(const std::filesystem::path& path)
    : path_(path),
      is_span_(path.extension() == ".span") {
    if (!is_span_) {
        segments_.push_back(std::make_unique<Segment>(path, 0));
        start_wall_ms_ = segments_.front()->Header().start_wall_ms;
    }
    Refresh();
    if (is_span_ && segments_.empty() && !grows_) {
        throw ArchiveError(path.string() + ": nothing of its footage is left");
    }
}

RecordingReader::RecordingReader(RecordingReader&&) noexcept = default;
RecordingReader::~RecordingReader() = default;

void RecordingReader::Refresh() {
    if (is_span_) {
        OpenSegments();
    }
    const std::int64_t newest_before_ms = newest_ms_;
    // They finish one after the other; what has finished is not read again.
    for (; read_segments_ < segments_.size(); ++read_segments_) {
        Append(static_cast<std::uint32_t>(read_segments_));
        if (segments_[read_segments_]->Grows()) {
            break;
        }
    }
    const bool is_open = read_segments_ < segments_.size();
    if (is_span_) {
        grows_ = is_open ? segments_[read_segments_]->LatestWallMs() < end_wall_ms_
                         : base::WallMillis() < end_wall_ms_ + kMaxIndexDelayMs;
    } else {
        grows_ = is_open;
    }
    if (grows_ && newest_ms_ >= 0) {
        RepeatUntilNow(newest_before_ms);
    }
}

// The wall clock tells how old the newest frame was when it was first seen; from then on the monotonic clock does.
void RecordingReader::RepeatUntilNow(std::int64_t newest_before_ms) {
    const std::int64_t now_us = base::MonotonicMicros();
    if (newest_before_ms < 0) {
        const std::int64_t age_ms = base::WallMillis() - start_wall_ms_ - newest_ms_;
        newest_us_ = now_us - std::clamp<std::int64_t>(age_ms, 0, kMaxSilenceMs) * 1000;
    } else if (newest_ms_ != newest_before_ms) {
        newest_us_ = now_us;
    }
    const std::int64_t end_ms =
        is_span_ ? end_wall_ms_ - start_wall_ms_ : std::int64_t{base::kMaxRecordingSeconds} * 1000;
    RepeatLast(std::min(newest_ms_ + (now_us - newest_us_) / 1000, end_ms) - kMaxIndexDelayMs);
}

// Opens the recordings that were added to the span file.
void RecordingReader::OpenSegments() {
    const Span span = ReadSpan(path_);
    start_wall_ms_ = span.begin_ms;
    end_wall_ms_ = span.end_ms;
    for (; named_ < span.recordings.size(); ++named_) {
        try {
            segments_.push_back(
                std::make_unique<Segment>(path_.parent_path().parent_path() / span.recordings[named_], std::nullopt));
        } catch (const std::system_error& error) {
            if (error.code() != std::errc::no_such_file_or_directory) {
                throw;
            }
        }
    }
}

void RecordingReader::Append(std::uint32_t number) {
    Segment& segment = *segments_[number];
    const std::vector<std::uint32_t> entries = segment.Refresh();
    // By the wall clock; when that was set back, the later recording still comes after the earlier one.
    const std::int64_t by_wall_ms = segment.Header().start_wall_ms - start_wall_ms_;
    const std::int64_t base_ms =
        segment.BaseMs(frames_.empty() ? by_wall_ms : std::max(by_wall_ms, frames_.back().time_ms + 1));
    if (frames_.empty()) {
        frames_.reserve(entries.size());
    }
    for (const std::uint32_t entry : entries) {
        const std::int64_t time_ms = segment.Entries()[entry].time_ms;
        const std::int64_t wall_ms = segment.Header().start_wall_ms + time_ms;
        if (!is_span_ || (wall_ms >= start_wall_ms_ && wall_ms < end_wall_ms_)) {
            Place(number, entry, base_ms + time_ms);
        }
    }
}

void RecordingReader::Place(std::uint32_t segment, std::uint32_t entry, std::int64_t time_ms) {
    if (!frames_.empty()) {
        RepeatLast(time_ms);
        time_ms = std::max(time_ms, frames_.back().time_ms + 1);
    }
    if (frames_.size() == INT_MAX) {
        throw ArchiveError(path_.string() + " has more frames than can be counted");
    }
    frames_.push_back({segment, entry, time_ms});
    newest_ms_ = time_ms;
}

void RecordingReader::RepeatLast(std::int64_t before_ms) {
    while (!frames_.empty() && before_ms - frames_.back().time_ms > kMaxFrameMs) {
        RecordedFrame again = frames_.back();
        again.time_ms += kMaxFrameMs;
        frames_.push_back(again);
    }
}

double RecordingReader::FrameRate() const {
    if (frames_.empty()) {
        throw ArchiveError(path_.string() + " has no frame yet");
    }
    const std::int64_t duration_ms = frames_.back().time_ms - frames_.front().time_ms;
    const double periods = static_cast<double>(frames_.size() - 1);
    return duration_ms == 0 ? 1.0 : std::clamp(periods * 1000.0 / static_cast<double>(duration_ms), 1.0, 1000.0);
}

std::int64_t RecordingReader::PeriodMs() const {
    return std::max<std::int64_t>(std::llround(1000.0 / FrameRate()), 1);
}

bool RecordingReader::Grows() const {
    return grows_;
}

int RecordingReader::IndexAt(std::int64_t time_ms) const {
    if (time_ms < 0 || frames_.empty()) {
        return -1;
    }
    const auto later =
        std::upper_bound(frames_.begin(), frames_.end(), time_ms,
                         [](std::int64_t time, const RecordedFrame& frame) { return time < frame.time_ms; });
    const std::int64_t index = std::max<std::int64_t>(later - frames_.begin() - 1, 0);
    if (later != frames_.end() || !grows_) {
        return static_cast<int>(index);
    }
    const std::int64_t ahead = std::max<std::int64_t>(time_ms - frames_.back().time_ms, 0) / PeriodMs();
    return static_cast<int>(std::min<std::int64_t>(index + std::min<std::int64_t>(ahead, INT_MAX), INT_MAX));
}

std::int64_t RecordingReader::TimeOf(int index) const {
    if (frames_.empty()) {
        return 0;
    }
    const int last = FrameCount() - 1;
    if (index > last) {
        return frames_.back().time_ms + (grows_ ? (std::int64_t{index} - last) * PeriodMs() : 0);
    }
    return frames_[static_cast<std::size_t>(std::max(index, 0))].time_ms;
}

std::int64_t RecordingReader::CapturedMs(int index) const {
    const RecordedFrame& frame = At(index);
    return Header(frame.segment).start_wall_ms + Entries(frame.segment)[frame.entry].time_ms;
}

const IndexHeader& RecordingReader::Header(std::uint32_t segment) const {
    return segments_.at(segment)->Header();
}

std::span<const FrameEntry> RecordingReader::Entries(std::uint32_t segment) const {
    return segments_.at(segment)->Entries();
}

const std::filesystem::path& RecordingReader::PathOf(std::uint32_t segment) const {
    return segments_.at(segment)->Path();
}

int RecordingReader::DescriptorOf(std::uint32_t segment) const {
    return segments_.at(segment)->Descriptor();
}

std::uint32_t RecordingReader::KeyEntryOf(std::uint32_t segment, std::uint32_t entry) const {
    const std::span<const FrameEntry> entries = Entries(segment);
    std::uint32_t key = entry;
    while (key > 0 && !(entries[key].key && entries[key].time_ms <= entries[entry].time_ms)) {
        --key;
    }
    return key;
}

void RecordingReader::ReadBytes(std::uint32_t segment, const FrameEntry& frame, std::span<std::uint8_t> buffer) const {
    segments_.at(segment)->ReadBytes(frame, buffer);
}

}  // namespace lookhaven::archive
