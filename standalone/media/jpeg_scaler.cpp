// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/jpeg_scaler.h"

#include <algorithm>
#include <memory>
#include <string>

#include <turbojpeg.h>

#include "standalone/media/jpeg.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr int kQuality = 80;
constexpr int kEighths = 8;
constexpr int kBytesPerPixel = 3;

using Handle = std::unique_ptr<void, int (*)(void*)>;

// What a picture that ends early is short of is a warning, and grey.
void Check(const Handle& handle, int result) {
    if (result != 0 && tjGetErrorCode(handle.get()) != TJERR_WARNING) {
        throw SourceError(std::string("cannot make a picture smaller: ") + tjGetErrorStr2(handle.get()));
    }
}

Handle Own(tjhandle handle) {
    if (handle == nullptr) {
        throw std::bad_alloc();
    }
    return {handle, tjDestroy};
}

}  // namespace

std::vector<std::uint8_t> ShrinkJpeg(std::span<const std::uint8_t> jpeg, int width) {
    const Handle from = Own(tjInitDecompress());
    PictureSize whole;
    int sampling = 0;
    int colours = 0;
    Check(from,
          tjDecompressHeader3(from.get(), jpeg.data(), jpeg.size(), &whole.width, &whole.height, &sampling, &colours));
    if (!whole.IsUsable()) {
        throw SourceError("a picture has an impossible size");
    }
    const tjscalingfactor factor{std::clamp((width * kEighths + whole.width - 1) / whole.width, 1, kEighths), kEighths};
    const PictureSize small{TJSCALED(whole.width, factor), TJSCALED(whole.height, factor)};
    std::vector<std::uint8_t> pixels(static_cast<std::size_t>(kBytesPerPixel) * static_cast<std::size_t>(small.width) *
                                     static_cast<std::size_t>(small.height));
    Check(from, tjDecompress2(from.get(), jpeg.data(), jpeg.size(), pixels.data(), small.width, 0, small.height,
                              TJPF_RGB, TJFLAG_LIMITSCANS));
    const Handle to = Own(tjInitCompress());
    std::vector<std::uint8_t> shrunk(tjBufSize(small.width, small.height, TJSAMP_420));
    unsigned char* output = shrunk.data();
    unsigned long size = shrunk.size();
    Check(to, tjCompress2(to.get(), pixels.data(), small.width, 0, small.height, TJPF_RGB, &output, &size, TJSAMP_420,
                          kQuality, TJFLAG_NOREALLOC));
    shrunk.resize(size);
    return shrunk;
}

}  // namespace lookhaven::media
