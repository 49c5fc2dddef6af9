// SPDX-License-Identifier: Apache-2.0
//
// Tells the units of an Annex B stream apart, and keeps parameter sets in front of its key frames.
//
// Why so        A viewer starts at any key frame, but many cameras send their parameter sets once, or only in their
//               description of the session.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// The frame holds a picture that needs no other.
bool IsKeyFrame(Codec codec, std::span<const std::uint8_t> frame);

// The piece of a stream begins with what may stand at the beginning of a picture: its first slice, or what precedes it.
bool MayBeginPicture(Codec codec, std::span<const std::uint8_t> piece);

class ParameterSets {
  public:
    // The codec is kH264 or kH265; initial holds the sets known so far, as Annex B, or nothing.
    ParameterSets(Codec codec, std::span<const std::uint8_t> initial);

    // The key frame behind its parameter sets: the frame itself when it brings them, which makes them the current ones,
    // else a copy that is valid until the next call.
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
