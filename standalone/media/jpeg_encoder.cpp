// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/jpeg_encoder.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <string>

#include <turbojpeg.h>

#include "standalone/media/source.h"

extern "C" {
#include <libswscale/swscale.h>
}

namespace lookhaven::media {

namespace {

constexpr int kQuality = 85;
constexpr int kFractionBits = 14;

// A colour space, as the weights of red and blue in luma.
struct Weights {
    double red = 0.299;
    double blue = 0.114;

    double Green() const { return 1 - red - blue; }
};

constexpr Weights kJpegWeights;

Weights WeightsOf(AVColorSpace space) {
    switch (space) {
    case AVCOL_SPC_BT709:
        return {0.2126, 0.0722};
    case AVCOL_SPC_BT2020_NCL:
    case AVCOL_SPC_BT2020_CL:
        return {0.2627, 0.0593};
    case AVCOL_SPC_SMPTE240M:
        return {0.212, 0.087};
    default:
        return kJpegWeights;
    }
}

// The conversion of a frame's samples to JPEG's, in fixed point with kFractionBits; chroma counts from its middle
// value.
struct Conversion {
    std::int32_t y_of_y = 0;
    std::int32_t y_base = 0;
    std::array<std::int32_t, 2> y_of_colour{};
    std::array<std::int32_t, 2> blue_of_colour{};
    std::array<std::int32_t, 2> red_of_colour{};
    bool is_identity = false;
};

Conversion ConversionOf(const AVFrame& frame) {
    const auto fixed = [](double number) {
        return static_cast<std::int32_t>(std::lround(number * (1 << kFractionBits)));
    };
    const bool is_full = frame.color_range == AVCOL_RANGE_JPEG || frame.format == AV_PIX_FMT_YUVJ420P;
    const Weights from = WeightsOf(frame.colorspace);
    const double y_scale = is_full ? 1 : 255.0 / 219;
    const double colour_scale = is_full ? 1 : 255.0 / 224;
    Conversion conversion;
    conversion.y_of_y = fixed(y_scale);
    conversion.y_base = fixed((is_full ? 0 : -16 * y_scale) + 0.5);
    conversion.is_identity = is_full && from.red == kJpegWeights.red && from.blue == kJpegWeights.blue;
    for (std::size_t i = 0; i < 2; ++i) {
        // One unit of blue or red difference, at constant luma.
        const double blue = i == 0 ? 2 * (1 - from.blue) : 0;
        const double red = i == 1 ? 2 * (1 - from.red) : 0;
        const double green = -(from.red * red + from.blue * blue) / from.Green();
        const double y = kJpegWeights.red * red + kJpegWeights.Green() * green + kJpegWeights.blue * blue;
        conversion.y_of_colour[i] = fixed(colour_scale * y);
        conversion.blue_of_colour[i] = fixed(colour_scale * (blue - y) / (2 * (1 - kJpegWeights.blue)));
        conversion.red_of_colour[i] = fixed(colour_scale * (red - y) / (2 * (1 - kJpegWeights.red)));
    }
    return conversion;
}

std::uint8_t Sample(std::int32_t fixed) {
    return static_cast<std::uint8_t>(std::clamp(fixed >> kFractionBits, 0, 255));
}

}  // namespace

void JpegEncoder::FreeScaler::operator()(SwsContext* scaler) const {
    sws_freeContext(scaler);
}

JpegEncoder::JpegEncoder() : compressor_(tjInitCompress(), tjDestroy) {
    if (compressor_ == nullptr) {
        throw std::bad_alloc();
    }
}

JpegEncoder::~JpegEncoder() = default;

JpegEncoder::Planes JpegEncoder::OwnPlanes(int width, int height) {
    // The scaler works in steps of 16 pixels and may write that much beyond the last row.
    constexpr std::size_t kOverrun = 64;
    const int colour_width = (width + 1) / 2;
    const auto y_bytes = static_cast<std::size_t>(width) * static_cast<std::size_t>(height);
    const auto colour_bytes = static_cast<std::size_t>(colour_width) * static_cast<std::size_t>((height + 1) / 2);
    planes_.resize(y_bytes + 2 * colour_bytes + kOverrun);
    const std::uint8_t* const begin = planes_.data();
    return {{begin, begin + y_bytes, begin + y_bytes + colour_bytes}, {width, colour_width, colour_width}};
}

// For 8-bit 4:2:0 frames, which nearly every camera sends.
JpegEncoder::Planes JpegEncoder::ConvertColours(const AVFrame& frame) {
    const Conversion with = ConversionOf(frame);
    if (with.is_identity) {
        return {{frame.data[0], frame.data[1], frame.data[2]},
                {frame.linesize[0], frame.linesize[1], frame.linesize[2]}};
    }
    const Planes to = OwnPlanes(frame.width, frame.height);
    const auto row = [](const std::uint8_t* plane, int stride, int number) {
        return plane + std::ptrdiff_t{stride} * number;
    };
    const auto own_row = [&](int plane, int number) {
        return const_cast<std::uint8_t*>(row(to.data[plane], to.strides[plane], number));
    };
    const int colours = to.strides[1];
    mix_.resize(static_cast<std::size_t>(2 * colours));
    std::int32_t* const mix = mix_.data();
    constexpr std::int32_t kMiddle = (128 << kFractionBits) + (1 << (kFractionBits - 1));
    for (int y = 0; y < frame.height; ++y) {
        if (y % 2 == 0) {
            const std::uint8_t* const blue = row(frame.data[1], frame.linesize[1], y / 2);
            const std::uint8_t* const red = row(frame.data[2], frame.linesize[2], y / 2);
            std::uint8_t* const to_blue = own_row(1, y / 2);
            std::uint8_t* const to_red = own_row(2, y / 2);
            for (int x = 0; x < colours; ++x) {
                const std::int32_t b = blue[x] - 128;
                const std::int32_t r = red[x] - 128;
                to_blue[x] = Sample(with.blue_of_colour[0] * b + with.blue_of_colour[1] * r + kMiddle);
                to_red[x] = Sample(with.red_of_colour[0] * b + with.red_of_colour[1] * r + kMiddle);
                mix[2 * x] = mix[2 * x + 1] = with.y_of_colour[0] * b + with.y_of_colour[1] * r + with.y_base;
            }
        }
        const std::uint8_t* const from_y = row(frame.data[0], frame.linesize[0], y);
        std::uint8_t* const to_y = own_row(0, y);
        for (int x = 0; x < frame.width; ++x) {
            to_y[x] = Sample(with.y_of_y * from_y[x] + mix[x]);
        }
    }
    return to;
}

// For any other frame, and for another size, with libswscale.
JpegEncoder::Planes JpegEncoder::ConvertLayout(const AVFrame& frame, int width, int height) {
    const int scaling = width == frame.width ? SWS_BILINEAR : SWS_AREA;
    scaler_.reset(sws_getContext(frame.width, frame.height, static_cast<AVPixelFormat>(frame.format), width, height,
                                 AV_PIX_FMT_YUVJ420P, scaling | SWS_ACCURATE_RND, nullptr, nullptr, nullptr));
    if (scaler_ == nullptr) {
        throw SourceError("cannot convert the picture");
    }
    constexpr int kUnchanged = 1 << 16;
    sws_setColorspaceDetails(scaler_.get(), sws_getCoefficients(frame.colorspace),
                             frame.color_range == AVCOL_RANGE_JPEG, sws_getCoefficients(SWS_CS_DEFAULT), 1, 0,
                             kUnchanged, kUnchanged);
    const Planes to = OwnPlanes(width, height);
    std::uint8_t* const rows[] = {const_cast<std::uint8_t*>(to.data[0]), const_cast<std::uint8_t*>(to.data[1]),
                                  const_cast<std::uint8_t*>(to.data[2])};
    CheckAv(sws_scale(scaler_.get(), frame.data, frame.linesize, 0, frame.height, rows, to.strides),
            "cannot convert the picture");
    return to;
}

std::span<const std::uint8_t> JpegEncoder::Encode(const AVFrame& frame, int width) {
    const bool is_usual = frame.format == AV_PIX_FMT_YUV420P || frame.format == AV_PIX_FMT_YUVJ420P;
    const bool is_smaller = width > 0 && width < frame.width;
    if (!is_smaller) {
        width = frame.width;
    }
    const int height = std::max(static_cast<int>(std::lround(1.0 * frame.height * width / frame.width)), 1);
    Planes planes = is_usual && !is_smaller ? ConvertColours(frame) : ConvertLayout(frame, width, height);
    // The compressor assumes a buffer of this size, whatever size it is told.
    const std::size_t needed = tjBufSize(width, height, TJSAMP_420);
    if (needed > jpeg_bytes_) {
        jpeg_ = std::make_unique_for_overwrite<std::uint8_t[]>(needed);
        jpeg_bytes_ = needed;
    }
    unsigned char* output = jpeg_.get();
    unsigned long size = needed;
    if (tjCompressFromYUVPlanes(compressor_.get(), planes.data, width, planes.strides, height, TJSAMP_420, &output,
                                &size, kQuality, TJFLAG_NOREALLOC) != 0) {
        throw SourceError(std::string("cannot encode: ") + tjGetErrorStr2(compressor_.get()));
    }
    return {jpeg_.get(), size};
}

}  // namespace lookhaven::media
