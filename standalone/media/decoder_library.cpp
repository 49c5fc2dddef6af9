// SPDX-License-Identifier: Apache-2.0
#include <string>

#include "standalone/media/frame_decoder.h"
#include "standalone/media/jpeg_scaler.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/media/source.h"
#include "standalone/media/still.h"

namespace lookhaven::media {

namespace {

Codec VideoCodecNamed(std::string_view name) {
    const std::optional<Codec> codec = base::CodecNamed(name);
    if (!codec || !base::IsVideo(*codec)) {
        throw SourceError("no decoder for " + std::string(name));
    }
    return *codec;
}

class Library : public DecoderLibrary {
  public:
    std::vector<std::uint8_t> Still(std::string_view codec, std::span<const std::uint8_t> frame,
                                    std::size_t max_bytes) const override {
        return JpegOfKeyFrame(VideoCodecNamed(codec), frame, max_bytes);
    }
    std::vector<std::uint8_t> Shrink(std::span<const std::uint8_t> jpeg, int width) const override {
        return ShrinkJpeg(jpeg, width);
    }
    Reencoded Reencode(std::string_view type, std::span<const std::uint8_t> file,
                       std::size_t max_bytes) const override {
        return media::Reencode(type, file, max_bytes);
    }
    std::unique_ptr<FrameDecoder> OpenDecoder(std::string_view codec, int threads) const override {
        return OpenFrameDecoder(VideoCodecNamed(codec), threads);
    }
};

}  // namespace

}  // namespace lookhaven::media

extern "C" __attribute__((visibility("default"))) const lookhaven::media::DecoderLibrary* LookhavenDecoder() {
    static const lookhaven::media::Library library;
    return &library;
}
