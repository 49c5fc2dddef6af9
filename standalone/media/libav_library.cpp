// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/libav_library.h"

#include <string>

#include "standalone/media/frame_decoder.h"
#include "standalone/media/remux.h"
#include "standalone/media/source.h"
#include "standalone/media/still.h"

namespace lookhaven::media {

namespace {

Codec CodecOfName(std::string_view name) {
    for (const Codec codec : {Codec::kMjpeg, Codec::kH264, Codec::kH265}) {
        if (name == CodecName(codec)) {
            return codec;
        }
    }
    throw SourceError("no decoder for " + std::string(name));
}

class Library : public LibavLibrary {
  public:
    std::vector<std::uint8_t> Still(std::string_view codec, std::span<const std::uint8_t> frame) const override {
        return JpegOfKeyFrame(CodecOfName(codec), frame);
    }
    std::unique_ptr<FrameDecoder> OpenDecoder(std::string_view codec) const override {
        return OpenFrameDecoder(CodecOfName(codec));
    }
    void Copy(const std::filesystem::path& recording, int output, const ExportOptions& options) const override {
        Export(recording, output, options);
    }
};

}  // namespace

}  // namespace lookhaven::media

extern "C" __attribute__((visibility("default"))) const lookhaven::media::LibavLibrary* LookhavenLibav() {
    static const lookhaven::media::Library library;
    return &library;
}
