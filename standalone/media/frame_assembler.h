// SPDX-License-Identifier: Apache-2.0
//
// Assembles the frames of an Annex B stream from the pieces that RTP delivers.
//
// Why so        libav's parser splits a picture where a camera repeats its parameter sets between the slices, and the
//               time alone may jump inside a picture when the camera corrects its clock, between its parameter sets
//               and its first slice, too. So a new picture begins only where both the time and the bytes say so, and
//               the previous one has a slice.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::media {

class FrameAssembler {
  public:
    struct Frame {
        std::span<const std::uint8_t> data;  // valid until the next call
        std::int64_t time_us = 0;
    };

    // codec: kH264 or kH265.
    explicit FrameAssembler(Codec codec) : codec_(codec) {}

    // Adds the next piece. When it begins a new picture, returns the previous one, which is complete now; drops a
    // picture above base::kMaxFrameBytes.
    std::optional<Frame> Add(std::span<const std::uint8_t> piece, std::int64_t time_us);

  private:
    Codec codec_;
    std::vector<std::uint8_t> pending_;
    bool has_picture_ = false;  // in pending_
    std::vector<std::uint8_t> whole_;
    std::int64_t pending_time_us_ = 0;
};

}  // namespace lookhaven::media
