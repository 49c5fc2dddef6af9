// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/still.h"

#include <algorithm>
#include <memory>
#include <string>

#include <turbojpeg.h>

#include "standalone/media/jpeg.h"
#include "standalone/media/libav.h"
#include "standalone/media/source.h"

extern "C" {
#include <libswscale/swscale.h>
}

namespace lookhaven::media {

namespace {

struct Rgb {
    int width = 0;
    int height = 0;
    std::vector<std::uint8_t> pixels;

    int Stride() const { return 3 * width; }
};

AvPtr<AVFrame> Decode(Codec codec, std::span<const std::uint8_t> bytes) {
    const AVCodecID id = codec == Codec::kH264   ? AV_CODEC_ID_H264
                         : codec == Codec::kH265 ? AV_CODEC_ID_HEVC
                                                 : AV_CODEC_ID_MJPEG;
    const AVCodec* decoder = avcodec_find_decoder(id);
    if (decoder == nullptr) {
        throw SourceError(std::string("needs libavcodec with ") + avcodec_get_name(id));
    }
    const AvPtr<AVCodecContext> context = OwnAv(avcodec_alloc_context3(decoder));
    context->thread_count = 1;
    context->max_pixels = std::int64_t{kMaxSidePixels} * kMaxSidePixels;
    CheckAv(avcodec_open2(context.get(), decoder, nullptr), "cannot open the decoder");
    const AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
    CheckAv(av_new_packet(packet.get(), static_cast<int>(bytes.size())), "cannot hold the frame");
    std::copy(bytes.begin(), bytes.end(), packet->data);
    CheckAv(avcodec_send_packet(context.get(), packet.get()), "cannot decode");
    CheckAv(avcodec_send_packet(context.get(), nullptr), "cannot decode");
    AvPtr<AVFrame> frame = OwnAv(av_frame_alloc());
    CheckAv(avcodec_receive_frame(context.get(), frame.get()), "cannot decode");
    return frame;
}

// By way of RGB, since JPEG has colours of its own: other coefficients and a range that most cameras do not use.
Rgb Convert(const AVFrame& frame) {
    const std::unique_ptr<SwsContext, void (*)(SwsContext*)> scaler(
        sws_getContext(frame.width, frame.height, static_cast<AVPixelFormat>(frame.format), frame.width, frame.height,
                       AV_PIX_FMT_RGB24, SWS_BILINEAR | SWS_ACCURATE_RND, nullptr, nullptr, nullptr),
        sws_freeContext);
    if (scaler == nullptr) {
        throw SourceError("cannot convert the picture");
    }
    constexpr int kUnchanged = 1 << 16;
    sws_setColorspaceDetails(scaler.get(), sws_getCoefficients(frame.colorspace), frame.color_range == AVCOL_RANGE_JPEG,
                             sws_getCoefficients(SWS_CS_DEFAULT), 1, 0, kUnchanged, kUnchanged);
    // The scaler works in steps of 16 pixels and may write that much beyond the last row.
    constexpr std::size_t kOverrun = 64;
    Rgb rgb{frame.width, frame.height, {}};
    rgb.pixels.resize(static_cast<std::size_t>(rgb.Stride()) * static_cast<std::size_t>(rgb.height) + kOverrun);
    std::uint8_t* const rows[] = {rgb.pixels.data()};
    const int strides[] = {rgb.Stride()};
    CheckAv(sws_scale(scaler.get(), frame.data, frame.linesize, 0, frame.height, rows, strides),
            "cannot convert the picture");
    return rgb;
}

std::vector<std::uint8_t> Compress(const Rgb& rgb) {
    constexpr int kQuality = 85;
    const std::unique_ptr<void, int (*)(void*)> compressor(tjInitCompress(), tjDestroy);
    std::vector<std::uint8_t> jpeg(tjBufSize(rgb.width, rgb.height, TJSAMP_420));
    unsigned char* output = jpeg.data();
    unsigned long size = jpeg.size();
    if (tjCompress2(compressor.get(), rgb.pixels.data(), rgb.width, rgb.Stride(), rgb.height, TJPF_RGB, &output, &size,
                    TJSAMP_420, kQuality, TJFLAG_NOREALLOC) != 0) {
        throw SourceError(std::string("cannot encode: ") + tjGetErrorStr2(compressor.get()));
    }
    jpeg.resize(size);
    return jpeg;
}

}  // namespace

std::vector<std::uint8_t> JpegOfKeyFrame(Codec codec, std::span<const std::uint8_t> frame) {
    PrepareAv();
    return Compress(Convert(*Decode(codec, frame)));
}

}  // namespace lookhaven::media
