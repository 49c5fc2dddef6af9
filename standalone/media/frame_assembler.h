// SPDX-License-Identifier: Apache-2.0
//
// Puts the frames of an Annex B stream together from the pieces in which RTP brings them.
//
// Why so        libav's parser cuts a picture in two where a camera repeats its parameter sets between the slices, and
//               the time alone may jump inside a picture, when the camera corrects its clock. A new picture is where
//               both the time and the bytes say so.
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

    // The codec is kH264 or kH265.
    explicit FrameAssembler(Codec codec) : codec_(codec) {}

    // Takes the next piece. When it begins a new picture, the one before is whole now and returned; a picture above
    // kMaxFrameBytes is lost.
    std::optional<Frame> Add(std::span<const std::uint8_t> piece, std::int64_t time_us);

  private:
    Codec codec_;
    std::vector<std::uint8_t> pending_;
    std::vector<std::uint8_t> whole_;
    std::int64_t pending_time_us_ = 0;
};

}  // namespace lookhaven::media
