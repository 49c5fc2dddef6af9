// SPDX-License-Identifier: Apache-2.0
//
// Turns H.264 and H.265 frames as Matroska stores them, units behind their lengths, into Annex B.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "standalone/media/annexb.h"

namespace lookhaven::media {

class StoredVideo {
  public:
    // codec: kH264 or kH265. configuration: the track's private data; where it is none of that codec, as with a camera
    // that never sent its parameter sets in time, frames are stored as Annex B.
    StoredVideo(Codec codec, std::span<const std::uint8_t> configuration);

    // The parameter sets of the configuration as Annex B; empty when it has none.
    const std::vector<std::uint8_t>& ConfiguredSets() const { return configured_; }

    // The frame as Annex B, a key frame with its parameter sets in front; valid until the next call. Empty for a frame
    // whose lengths are damaged.
    std::span<const std::uint8_t> ToAnnexB(std::span<const std::uint8_t> frame, bool is_key);

  private:
    void ReadH264(std::span<const std::uint8_t> configuration);
    void ReadH265(std::span<const std::uint8_t> configuration);

    std::size_t length_bytes_ = 0;  // 0: Annex B
    std::vector<std::uint8_t> configured_;
    ParameterSets sets_;
    std::vector<std::uint8_t> converted_;
};

}  // namespace lookhaven::media
