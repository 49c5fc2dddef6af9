// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/reencode.h"

#include <algorithm>
#include <memory>
#include <utility>

#include <turbojpeg.h>

#include "standalone/media/exif.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/jpeg_encoder.h"
#include "standalone/media/libav.h"
#include "standalone/media/source.h"

extern "C" {
#include <libavutil/opt.h>
#include <libavutil/pixdesc.h>
#include <libswscale/swscale.h>
}

namespace lookhaven::media {

namespace {

using Outcome = Reencoded::Outcome;

constexpr int kQuality = 90;
constexpr int kBytesPerPixel = 3;

struct Pixels {
    PictureSize size;
    int sampling = TJSAMP_444;
    std::vector<std::uint8_t> rgb;
};

using Jpeg = std::unique_ptr<void, int (*)(void*)>;

Jpeg Own(tjhandle handle) {
    if (handle == nullptr) {
        throw std::bad_alloc();
    }
    return {handle, tjDestroy};
}

// What a picture that ends early is short of is a warning, and grey.
void Check(const Jpeg& jpeg, int result) {
    if (result != 0 && tjGetErrorCode(jpeg.get()) != TJERR_WARNING) {
        throw SourceError(std::string("cannot re-encode a picture: ") + tjGetErrorStr2(jpeg.get()));
    }
}

bool HasTooManyPixels(const PictureSize& size) {
    return size.width > kMaxReencodedSidePixels || size.height > kMaxReencodedSidePixels ||
           std::int64_t{size.width} * size.height > kMaxReencodedPixels;
}

int Number(std::span<const std::uint8_t> file, std::size_t at, std::size_t bytes, bool is_big_endian) {
    std::uint32_t number = 0;
    for (std::size_t i = 0; i < bytes && at + bytes <= file.size(); ++i) {
        number = number << 8U | file[is_big_endian ? at + i : at + bytes - 1 - i];
    }
    return static_cast<int>(std::min(number, std::uint32_t{0x7fffffff}));
}

// As the file's header says, which libav parses again. 0 where there is none.
PictureSize SizeInHead(std::string_view type, std::span<const std::uint8_t> file) {
    if (type == "png") {
        constexpr std::size_t kHead = 12;
        const bool has_head = Number(file, kHead, 4, true) == 0x49484452;  // "IHDR"
        return has_head ? PictureSize{Number(file, 16, 4, true), Number(file, 20, 4, true)} : PictureSize{};
    }
    constexpr std::size_t kChunk = 15;  // the last letter of its name: "VP8 ", "VP8L", "VP8X"
    switch (file.size() > kChunk ? file[kChunk] : 0) {
    case ' ':
        return {Number(file, 26, 2, false) & 0x3fff, Number(file, 28, 2, false) & 0x3fff};
    case 'L': {
        constexpr unsigned kBits = 14;
        const int low = Number(file, 21, 3, false);
        const int high = Number(file, 22, 3, false);
        return {(low & 0x3fff) + 1, ((high >> (kBits - 8)) & 0x3fff) + 1};
    }
    case 'X':
        return {Number(file, 24, 3, false) + 1, Number(file, 27, 3, false) + 1};
    default:
        return {};
    }
}

std::vector<std::uint8_t> EncodeJpeg(const Pixels& pixels) {
    const Jpeg encoder = Own(tjInitCompress());
    const auto [width, height] = pixels.size;
    std::vector<std::uint8_t> jpeg(tjBufSize(width, height, pixels.sampling));
    unsigned char* output = jpeg.data();
    unsigned long size = jpeg.size();
    Check(encoder, tjCompress2(encoder.get(), pixels.rgb.data(), width, 0, height, TJPF_RGB, &output, &size,
                               pixels.sampling, kQuality, TJFLAG_NOREALLOC));
    jpeg.resize(size);
    return jpeg;
}

// The picture upright.
Pixels Turn(Pixels pixels, int orientation) {
    if (orientation == 1) {
        return pixels;
    }
    const auto [width, height] = pixels.size;
    const bool is_turned = orientation >= 5;
    const bool from_right = orientation == 2 || orientation == 3 || orientation == 7 || orientation == 8;
    const bool from_below = orientation == 3 || orientation == 4 || orientation == 6 || orientation == 7;
    Pixels upright{pixels.size, pixels.sampling, std::vector<std::uint8_t>(pixels.rgb.size())};
    if (is_turned) {
        std::swap(upright.size.width, upright.size.height);
    }
    std::uint8_t* to = upright.rgb.data();
    for (int y = 0; y < upright.size.height; ++y) {
        for (int x = 0; x < upright.size.width; ++x, to += kBytesPerPixel) {
            const int column = is_turned ? y : x;
            const int row = is_turned ? x : y;
            const std::int64_t from =
                std::int64_t{from_below ? height - 1 - row : row} * width + (from_right ? width - 1 - column : column);
            std::copy_n(pixels.rgb.data() + from * kBytesPerPixel, kBytesPerPixel, to);
        }
    }
    return upright;
}

Reencoded ReencodeJpeg(std::span<const std::uint8_t> file) {
    const Jpeg decoder = Own(tjInitDecompress());
    Pixels pixels;
    int colours = 0;
    auto& [width, height] = pixels.size;
    Check(decoder,
          tjDecompressHeader3(decoder.get(), file.data(), file.size(), &width, &height, &pixels.sampling, &colours));
    if (HasTooManyPixels(pixels.size)) {
        return {Outcome::kTooManyPixels, {}};
    }
    pixels.rgb.resize(static_cast<std::size_t>(kBytesPerPixel) * static_cast<std::size_t>(width) *
                      static_cast<std::size_t>(height));
    Check(decoder, tjDecompress2(decoder.get(), file.data(), file.size(), pixels.rgb.data(), width, 0, height, TJPF_RGB,
                                 TJFLAG_LIMITSCANS));
    return {Outcome::kJpeg, EncodeJpeg(Turn(std::move(pixels), OrientationOf(file)))};
}

AvPtr<AVFrame> Decode(AVCodecID id, std::span<const std::uint8_t> file) {
    PrepareAv();
    const AVCodec* codec = avcodec_find_decoder(id);
    if (codec == nullptr) {
        throw SourceError(std::string("needs libavcodec with ") + avcodec_get_name(id));
    }
    const AvPtr<AVCodecContext> decoder = OwnAv(avcodec_alloc_context3(codec));
    decoder->thread_count = 1;
    decoder->max_pixels = kMaxReencodedPixels;
    CheckAv(avcodec_open2(decoder.get(), codec, nullptr), "cannot open the decoder");
    const AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
    CheckAv(av_new_packet(packet.get(), static_cast<int>(file.size())), "cannot hold the picture");
    std::copy(file.begin(), file.end(), packet->data);
    CheckAv(avcodec_send_packet(decoder.get(), packet.get()), "cannot decode");
    CheckAv(avcodec_send_packet(decoder.get(), nullptr), "cannot decode");
    AvPtr<AVFrame> frame = OwnAv(av_frame_alloc());
    CheckAv(avcodec_receive_frame(decoder.get(), frame.get()), "cannot decode");
    return frame;
}

AvPtr<AVFrame> Convert(const AVFrame& frame, AVPixelFormat format) {
    AvPtr<AVFrame> converted = OwnAv(av_frame_alloc());
    converted->width = frame.width;
    converted->height = frame.height;
    converted->format = format;
    CheckAv(av_frame_get_buffer(converted.get(), 0), "cannot hold the picture");
    const std::unique_ptr<SwsContext, void (*)(SwsContext*)> scaler(
        sws_getContext(frame.width, frame.height, static_cast<AVPixelFormat>(frame.format), frame.width, frame.height,
                       format, SWS_BILINEAR | SWS_ACCURATE_RND, nullptr, nullptr, nullptr),
        sws_freeContext);
    if (scaler == nullptr) {
        throw SourceError("cannot convert the picture");
    }
    CheckAv(sws_scale(scaler.get(), frame.data, frame.linesize, 0, frame.height, converted->data, converted->linesize),
            "cannot convert the picture");
    return converted;
}

std::vector<std::uint8_t> EncodePng(const AVFrame& frame) {
    const AVCodec* codec = avcodec_find_encoder(AV_CODEC_ID_PNG);
    if (codec == nullptr) {
        throw SourceError("needs libavcodec with an encoder of PNG");
    }
    const AvPtr<AVCodecContext> encoder = OwnAv(avcodec_alloc_context3(codec));
    encoder->width = frame.width;
    encoder->height = frame.height;
    encoder->pix_fmt = static_cast<AVPixelFormat>(frame.format);
    encoder->time_base = {1, 1};
    encoder->thread_count = 1;
    CheckAv(av_opt_set(encoder->priv_data, "pred", "mixed", 0), "cannot set up the encoder");
    CheckAv(avcodec_open2(encoder.get(), codec, nullptr), "cannot open the encoder");
    CheckAv(avcodec_send_frame(encoder.get(), &frame), "cannot encode");
    CheckAv(avcodec_send_frame(encoder.get(), nullptr), "cannot encode");
    const AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
    CheckAv(avcodec_receive_packet(encoder.get(), packet.get()), "cannot encode");
    return {packet->data, packet->data + packet->size};
}

Pixels PixelsOf(const AVFrame& frame) {
    const AvPtr<AVFrame> rgb = Convert(frame, AV_PIX_FMT_RGB24);
    Pixels pixels{{frame.width, frame.height}, TJSAMP_444, {}};
    const auto row_bytes = static_cast<std::size_t>(kBytesPerPixel) * static_cast<std::size_t>(frame.width);
    pixels.rgb.reserve(row_bytes * static_cast<std::size_t>(frame.height));
    for (int y = 0; y < frame.height; ++y) {
        const std::uint8_t* const row = rgb->data[0] + std::ptrdiff_t{rgb->linesize[0]} * y;
        pixels.rgb.insert(pixels.rgb.end(), row, row + row_bytes);
    }
    return pixels;
}

Reencoded ReencodeByLibav(std::string_view type, std::span<const std::uint8_t> file, std::size_t max_bytes) {
    if (HasTooManyPixels(SizeInHead(type, file))) {
        return {Outcome::kTooManyPixels, {}};
    }
    const AvPtr<AVFrame> frame = Decode(type == "png" ? AV_CODEC_ID_PNG : AV_CODEC_ID_WEBP, file);
    if (frame->format == AV_PIX_FMT_YUV420P) {  // WebP as cameras take pictures
        JpegEncoder encoder;
        const std::span<const std::uint8_t> jpeg = encoder.Encode(*frame);
        return {Outcome::kJpeg, {jpeg.begin(), jpeg.end()}};
    }
    const AVPixFmtDescriptor* about = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame->format));
    // A palette may hold transparent colours.
    const bool has_alpha = (about->flags & (AV_PIX_FMT_FLAG_ALPHA | AV_PIX_FMT_FLAG_PAL)) != 0;
    const AVPixelFormat format = has_alpha                   ? AV_PIX_FMT_RGBA
                                 : about->nb_components == 1 ? AV_PIX_FMT_GRAY8
                                                             : AV_PIX_FMT_RGB24;
    std::vector<std::uint8_t> png = EncodePng(*Convert(*frame, format));
    if (png.size() <= max_bytes || has_alpha) {
        return {Outcome::kPng, std::move(png)};
    }
    return {Outcome::kJpeg, EncodeJpeg(PixelsOf(*frame))};
}

}  // namespace

Reencoded Reencode(std::string_view type, std::span<const std::uint8_t> file, std::size_t max_bytes) {
    try {
        Reencoded reencoded = type == "jpg" ? ReencodeJpeg(file) : ReencodeByLibav(type, file, max_bytes);
        return reencoded.file.size() <= max_bytes ? reencoded : Reencoded{Outcome::kTooLarge, {}};
    } catch (const SourceError&) {
        return {};
    }
}

}  // namespace lookhaven::media
