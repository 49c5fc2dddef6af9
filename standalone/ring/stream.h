// SPDX-License-Identifier: Apache-2.0
//
// What a ring carries: which stream, in what format, and how one entry looks in memory.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "standalone/base/video.h"

namespace lookhaven::ring {

using base::Medium;

struct StreamId {
    std::int32_t camera = 0;
    std::int32_t stream = 0;
    Medium medium = Medium::kVideo;

    bool operator==(const StreamId&) const = default;
};

// "camera 3 stream 0 video"
std::string NameOf(const StreamId& id);

constexpr std::size_t kMaxCodecLength = 31;
constexpr std::size_t kMaxExtraBytes = 1024;

// Fixed for the life of a segment: a change of any field retires it.
struct StreamFormat {
    std::string codec;                      // "MJPEG", "H264", "AAC" …; at most kMaxCodecLength characters
    std::vector<unsigned char> extra_data;  // decoder configuration; more than kMaxExtraBytes counts as none
    std::int32_t width = 0;                 // 0 where unknown or audio
    std::int32_t height = 0;
    bool every_frame_is_key = false;  // MJPEG and audio: any entry may be the first

    bool operator==(const StreamFormat&) const = default;
};

// How much a ring holds.
struct Geometry {
    std::uint32_t index_slots = 0;  // entries; fewer than there are sequence numbers
    std::uint64_t arena_bytes = 0;  // entry heads and data

    bool operator==(const Geometry&) const = default;
};

// What is known of a stream before its ring is made; zero where unknown.
struct StreamEstimate {
    Medium medium = Medium::kVideo;
    bool every_frame_is_key = false;
    std::int64_t bits_per_second = 0;
    std::int64_t largest_frame_bytes = 0;
    double frames_per_second = 0;
};

// A geometry that holds a group of pictures and more, or three seconds where every frame is a key frame. Rounded, so
// that two estimates of one stream mostly give the same. The writer enlarges a ring that turns out too small.
Geometry GeometryFor(const StreamEstimate& estimate);

// Sequence numbers run 0 … kLastSequence and begin again; kNoSequence names no entry: nothing read yet.
constexpr std::int32_t kLastSequence = 10000;
constexpr std::int32_t kNoSequence = 10001;

constexpr std::uint32_t kKeyFrame = 2;  // bit of Entry::flags

// One frame to write. The span is borrowed for the call.
struct Frame {
    std::span<const unsigned char> data;  // 1 … base::kMaxFrameBytes
    std::int32_t offset = 0;              // of the picture within the data
    bool is_key = false;
    std::int64_t timestamp_micros = 0;
    std::int64_t capture_millis = 0;  // UTC
};

// The head of one entry; its data follows directly. The picture or audio block is the length - offset bytes that begin
// offset bytes into the data.
struct Entry {
    std::int32_t length;
    std::int32_t sequence;
    std::int32_t offset;
    std::uint32_t flags;
    std::uint32_t timestamp_low;  // microseconds of a clock that video and audio share
    std::uint32_t timestamp_high;
    std::uint32_t capture_low;  // milliseconds since the epoch (UTC) when the frame was captured
    std::uint32_t capture_high;
    std::uint32_t count_low;  // entries ever written to the ring, this one included
    std::uint32_t count_high;
    std::uint32_t spare;

    const unsigned char* Data() const { return reinterpret_cast<const unsigned char*>(this + 1); }
    std::int64_t TimestampMicros() const { return Join(timestamp_low, timestamp_high); }
    std::int64_t CaptureMillis() const { return Join(capture_low, capture_high); }
    std::uint64_t Count() const { return static_cast<std::uint64_t>(Join(count_low, count_high)); }

  private:
    static std::int64_t Join(std::uint32_t low, std::uint32_t high) {
        return static_cast<std::int64_t>((std::uint64_t{high} << 32) | low);
    }
};
static_assert(sizeof(Entry) == 44, "data begins 44 bytes after its entry");

}  // namespace lookhaven::ring
