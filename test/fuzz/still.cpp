// SPDX-License-Identifier: Apache-2.0
//
// Makes a picture of a key frame of any bytes, in each codec: it must have a usable size.
#include "standalone/media/still.h"

#include "standalone/media/jpeg.h"
#include "standalone/media/jpeg_scaler.h"
#include "standalone/media/source.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    constexpr media::Codec kCodecs[] = {media::Codec::kMjpeg, media::Codec::kH264, media::Codec::kH265};
    fuzz::Input input(data, size);
    const media::Codec codec = kCodecs[input.Take<std::uint8_t>() % std::size(kCodecs)];
    try {
        if (codec == media::Codec::kMjpeg) {
            fuzz::Require(media::JpegSize(media::ShrinkJpeg(input.Rest(), 320)).has_value());
        }
        fuzz::Require(media::JpegSize(media::JpegOfKeyFrame(codec, input.Rest())).has_value());
    } catch (const media::SourceError&) {
    }
    return 0;
}
