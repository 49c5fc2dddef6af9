// SPDX-License-Identifier: Apache-2.0
//
// The test pattern's sound: a quiet chime about once a second, as AAC.
//
// Why so        The chime repeats after a whole number of AAC blocks, so one round is encoded at the start and played
//               for ever: sound then costs no time at all.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::pattern {

class Chime {
  public:
    // Encodes one round. Throws media::SourceError.
    Chime();

    const media::StreamFormat& Format() const { return format_; }

    // The block of that number, from 0 on without an end, and its time since the first, in microseconds.
    std::span<const std::uint8_t> Block(std::int64_t number) const;
    std::int64_t BlockTime(std::int64_t number) const;

  private:
    media::StreamFormat format_;
    std::vector<std::vector<std::uint8_t>> blocks_;
};

}  // namespace lookhaven::pattern
