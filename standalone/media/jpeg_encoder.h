// SPDX-License-Identifier: Apache-2.0
//
// Encodes decoded frames as JPEG pictures.
//
// Why so        JPEG uses other colour coefficients and another range than most cameras. Both are converted in one pass
//               over the planes, which is cheaper than going through RGB and loses nothing.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "standalone/media/libav.h"

struct SwsContext;

namespace lookhaven::media {

class JpegEncoder {
  public:
    JpegEncoder();
    ~JpegEncoder();

    // The picture of the frame, valid until the next call. width: made that wide, at the frame's proportions; 0, or not
    // less than the frame's: as it is. Throws SourceError.
    std::span<const std::uint8_t> Encode(const AVFrame& frame, int width = 0);

  private:
    struct Planes {
        const std::uint8_t* data[3] = {};
        int strides[3] = {};
    };
    struct FreeScaler {
        void operator()(SwsContext* scaler) const;
    };

    Planes OwnPlanes(int width, int height);
    Planes ConvertColours(const AVFrame& frame);
    Planes ConvertLayout(const AVFrame& frame, int width, int height);

    std::unique_ptr<void, int (*)(void*)> compressor_;
    std::unique_ptr<SwsContext, FreeScaler> scaler_;
    std::vector<std::uint8_t> planes_;
    std::vector<std::int32_t> mix_;  // what a row's chroma adds to its luma
    std::unique_ptr<std::uint8_t[]> jpeg_;
    std::size_t jpeg_bytes_ = 0;
};

}  // namespace lookhaven::media
