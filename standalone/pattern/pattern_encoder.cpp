// SPDX-License-Identifier: Apache-2.0
#include "standalone/pattern/pattern_encoder.h"

#include <array>

#include <turbojpeg.h>

#include "standalone/media/annexb.h"
#include "standalone/media/libav.h"
#include "standalone/media/source.h"

extern "C" {
#include <libavutil/opt.h>
}

namespace lookhaven::pattern {

namespace {

class MjpegEncoder : public PatternEncoder {
  public:
    explicit MjpegEncoder(const PatternSettings& settings)
        : quality_(settings.quality),
          format_{base::Codec::kMjpeg, settings.width, settings.height, 0, 0, {}},
          compressor_(tjInitCompress(), tjDestroy),
          buffer_(tjBufSize(settings.width, settings.height, TJSAMP_420)) {}

    const media::StreamFormat& Format() const override { return format_; }

    EncodedPicture Encode(const Picture& picture, std::int64_t) override {
        std::array<const unsigned char*, 3> planes{picture[0].Row(0), picture[1].Row(0), picture[2].Row(0)};
        const std::array<int, 3> strides{picture[0].width, picture[1].width, picture[2].width};
        unsigned char* output = buffer_.data();
        unsigned long size = buffer_.size();
        if (tjCompressFromYUVPlanes(compressor_.get(), planes.data(), format_.width, strides.data(), format_.height,
                                    TJSAMP_420, &output, &size, quality_, TJFLAG_NOREALLOC) != 0) {
            throw media::SourceError(std::string("cannot encode: ") + tjGetErrorStr2(compressor_.get()));
        }
        return {{buffer_.data(), size}, true};
    }

  private:
    int quality_;
    media::StreamFormat format_;
    std::unique_ptr<void, int (*)(void*)> compressor_;
    std::vector<unsigned char> buffer_;
};

class H264Encoder : public PatternEncoder {
  public:
    explicit H264Encoder(const PatternSettings& settings) : packet_(media::OwnAv(av_packet_alloc())) {
        const AVCodec* codec = avcodec_find_encoder_by_name("libx264");
        if (codec == nullptr) {
            throw media::SourceError("needs libavcodec with libx264");
        }
        encoder_ = media::OwnAv(avcodec_alloc_context3(codec));
        encoder_->width = settings.width;
        encoder_->height = settings.height;
        encoder_->pix_fmt = AV_PIX_FMT_YUV420P;
        encoder_->color_range = AVCOL_RANGE_JPEG;
        encoder_->colorspace = AVCOL_SPC_SMPTE170M;
        encoder_->time_base = {1, settings.fps};
        encoder_->framerate = {settings.fps, 1};
        encoder_->gop_size = settings.gop;
        encoder_->thread_count = 1;
        for (const auto& [key, value] : {std::pair{"preset", "ultrafast"},
                                         {"tune", "zerolatency"},
                                         {"crf", "23"},
                                         {"forced-idr", "1"},
                                         {"x264-params", "scenecut=0"}}) {
            media::CheckAv(av_opt_set(encoder_->priv_data, key, value, 0), "cannot set up libx264");
        }
        media::CheckAv(avcodec_open2(encoder_.get(), codec, nullptr), "cannot set up libx264");
        format_ = {base::Codec::kH264, settings.width, settings.height, 0, 0, {}};
    }

    const media::StreamFormat& Format() const override { return format_; }

    EncodedPicture Encode(const Picture& picture, std::int64_t number) override {
        media::AvPtr<AVFrame> frame = Borrow(picture);
        frame->pts = number;
        media::CheckAv(avcodec_send_frame(encoder_.get(), frame.get()), "cannot encode");
        av_packet_unref(packet_.get());
        media::CheckAv(avcodec_receive_packet(encoder_.get(), packet_.get()), "cannot encode");
        const std::span<const std::uint8_t> data{packet_->data, static_cast<std::size_t>(packet_->size)};
        const bool key_frame = (packet_->flags & AV_PKT_FLAG_KEY) != 0;
        if (key_frame && format_.extra_data.empty()) {
            format_.extra_data = media::ParameterSets(base::Codec::kH264, data).Current();
        }
        return {data, key_frame};
    }

  private:
    media::AvPtr<AVFrame> Borrow(const Picture& picture) const {
        media::AvPtr<AVFrame> frame = media::OwnAv(av_frame_alloc());
        frame->format = encoder_->pix_fmt;
        frame->width = encoder_->width;
        frame->height = encoder_->height;
        frame->color_range = encoder_->color_range;
        for (std::size_t p = 0; p < picture.size(); ++p) {
            // libav only reads from a frame that is to be encoded.
            frame->data[p] = const_cast<std::uint8_t*>(picture[p].Row(0));
            frame->linesize[p] = picture[p].width;
        }
        return frame;
    }

    media::AvPtr<AVCodecContext> encoder_;
    media::AvPtr<AVPacket> packet_;
    media::StreamFormat format_;
};

}  // namespace

std::unique_ptr<PatternEncoder> MakePatternEncoder(const std::string& codec, const PatternSettings& settings) {
    if (codec == "mjpeg") {
        return std::make_unique<MjpegEncoder>(settings);
    }
    if (codec == "h264") {
        return std::make_unique<H264Encoder>(settings);
    }
    throw media::SourceError("has an unknown test pattern (known are test:mjpeg and test:h264)");
}

}  // namespace lookhaven::pattern
