// SPDX-License-Identifier: Apache-2.0
//
// Recognises the NAL units of an Annex B stream, and puts parameter sets in front of its key frames.
//
// Why so        A viewer starts at any key frame, but many cameras send their parameter sets only once, or only in the
//               session description.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// Whether the frame can be decoded without any other.
bool IsKeyFrame(Codec codec, std::span<const std::uint8_t> frame);

// Whether a slice is among the frame's units, which may else be parameter sets and messages alone.
bool HasPicture(Codec codec, std::span<const std::uint8_t> frame);

// Whether a piece of the stream may begin a picture: it begins with a first slice, or with a unit that precedes one.
bool MayBeginPicture(Codec codec, std::span<const std::uint8_t> piece);

class ParameterSets {
  public:
    // codec: kH264 or kH265. initial: the sets known so far, as Annex B; may be empty.
    ParameterSets(Codec codec, std::span<const std::uint8_t> initial);

    // The key frame with its parameter sets in front. A frame that contains them is returned as it is, and its sets
    // become the current ones; else a copy, valid until the next call. Sets beyond what any camera sends count as none.
    std::span<const std::uint8_t> Complete(std::span<const std::uint8_t> key_frame);

    // The current sets as Annex B; empty while there are none.
    const std::vector<std::uint8_t>& Current() const { return current_; }

  private:
    std::vector<std::uint8_t> SetsOf(std::span<const std::uint8_t> frame) const;

    Codec codec_;
    std::vector<std::uint8_t> current_;
    std::vector<std::uint8_t> completed_;
};

}  // namespace lookhaven::media
