// SPDX-License-Identifier: Apache-2.0
//
// The test pattern's sound: a quiet chime about once a second, as AAC.
//
// Why so        The chime repeats after a whole number of AAC blocks, so one period is encoded at the start and played
//               in a loop: afterwards sound takes no processor time.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/packet.h"

namespace lookhaven::pattern {

class Chime {
  public:
    // Encodes one period. Throws media::SourceError.
    Chime();

    const media::StreamFormat& Format() const { return format_; }

    // Any number from 0 on; BlockTime is in microseconds since block 0.
    std::span<const std::uint8_t> Block(std::int64_t number) const;
    std::int64_t BlockTime(std::int64_t number) const;

  private:
    media::StreamFormat format_;
    std::vector<std::vector<std::uint8_t>> blocks_;
};

}  // namespace lookhaven::pattern
