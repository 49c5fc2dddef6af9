// SPDX-License-Identifier: Apache-2.0
//
// Reads any frame of a recording as a JPEG picture.
//
// Why so        Motion JPEG is one read from the file, without libav. Other codecs are decoded from the key frame before;
//               the decoder's state is kept, so frames in a row are decoded once, and a jump forward decodes on from here
//               or from a later key frame, whichever is nearer.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "standalone/archive/recording.h"
#include "standalone/media/libav_library.h"

namespace lookhaven::media {

class PictureReader {
  public:
    // The recording must outlive the reader; it may be refreshed between calls.
    explicit PictureReader(const archive::Recording& recording) : recording_(recording) {}

    // Stores the picture of a valid index and returns its size. Throws SourceError when it cannot be decoded or does not
    // fit, archive::ArchiveError, std::system_error.
    std::size_t Read(int index, std::span<std::uint8_t> buffer);

  private:
    struct Place {
        std::uint32_t segment = 0;
        std::uint32_t entry = 0;

        bool operator==(const Place&) const = default;
    };

    bool Seek(Place target);
    void Decode(Place target);
    std::span<const std::uint8_t> Bytes(Place place);

    const archive::Recording& recording_;
    std::unique_ptr<FrameDecoder> decoder_;
    std::vector<std::uint8_t> bytes_;
    bool decodes_ = false;  // the decoder is inside a row of frames
    std::uint32_t decoder_segment_ = 0;
    std::uint32_t next_entry_ = 0;  // to feed
    std::int64_t shown_ = -1;       // entry of the picture that was taken last; -1 for none
};

}  // namespace lookhaven::media
