// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/frame_decoder.h"

#include <algorithm>
#include <string>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/jpeg_encoder.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::size_t kLengthBytes = 4;

std::size_t LengthAt(std::span<const std::uint8_t> frame, std::size_t at) {
    return std::size_t{frame[at]} << 24 | std::size_t{frame[at + 1]} << 16 | std::size_t{frame[at + 2]} << 8 |
           frame[at + 3];
}

// Whether the frame consists of NAL units that each follow their length, as in containers.
bool HasLengths(std::span<const std::uint8_t> frame) {
    std::size_t at = 0;
    while (frame.size() - at >= kLengthBytes) {
        const std::size_t length = LengthAt(frame, at);
        if (length > frame.size() - at - kLengthBytes) {
            return false;
        }
        at += kLengthBytes + length;
    }
    return at == frame.size();
}

// A start code is as long as a length.
void ReplaceLengths(std::span<std::uint8_t> frame) {
    for (std::size_t at = 0; at < frame.size();) {
        const std::size_t length = LengthAt(frame, at);
        frame[at] = frame[at + 1] = frame[at + 2] = 0;
        frame[at + 3] = 1;
        at += kLengthBytes + length;
    }
}

class AvFrameDecoder : public FrameDecoder {
  public:
    AvFrameDecoder(Codec codec, int threads)
        : context_(OpenVideoDecoder(codec, threads)),
          packet_(OwnAv(av_packet_alloc())),
          frame_(OwnAv(av_frame_alloc())),
          next_(OwnAv(av_frame_alloc())) {}

    void Restart() override { avcodec_flush_buffers(context_.get()); }

    void Feed(std::span<const std::uint8_t> frame, std::int64_t number, bool is_wanted) override {
        if (frame.empty()) {
            avcodec_send_packet(context_.get(), nullptr);
            return;
        }
        av_packet_unref(packet_.get());
        CheckAv(av_new_packet(packet_.get(), static_cast<int>(frame.size())), "cannot hold the frame");
        std::copy(frame.begin(), frame.end(), packet_->data);
        if (HasLengths(frame)) {
            ReplaceLengths({packet_->data, frame.size()});
        }
        packet_->pts = number;
        // In H.265 a picture of a higher temporal layer may build on one that its own layer calls unused.
        const bool may_skip = !is_wanted && context_->codec_id == AV_CODEC_ID_H264;
        context_->skip_frame = may_skip ? AVDISCARD_NONREF : AVDISCARD_DEFAULT;
        avcodec_send_packet(context_.get(), packet_.get());
    }

    std::optional<std::int64_t> Take() override {
        int result = AVERROR_INVALIDDATA;
        // Failures of the other threads are reported here, once for each frame.
        for (int i = 0; i <= context_->thread_count && result == AVERROR_INVALIDDATA; ++i) {
            result = avcodec_receive_frame(context_.get(), next_.get());
        }
        if (result < 0) {
            return std::nullopt;  // the picture that was taken last stays valid
        }
        std::swap(frame_, next_);
        return frame_->pts;
    }

    std::size_t Encode(std::span<std::uint8_t> jpeg, int width) override {
        const std::span<const std::uint8_t> picture = encoder_.Encode(*frame_, width);
        if (picture.size() > jpeg.size()) {
            throw SourceError("a picture of " + std::to_string(picture.size()) + " bytes is too large");
        }
        std::copy(picture.begin(), picture.end(), jpeg.begin());
        return picture.size();
    }

  private:
    AvPtr<AVCodecContext> context_;
    AvPtr<AVPacket> packet_;
    AvPtr<AVFrame> frame_;
    AvPtr<AVFrame> next_;
    JpegEncoder encoder_;
};

}  // namespace

AvPtr<AVCodecContext> OpenVideoDecoder(Codec codec, int threads, int halvings) {
    PrepareAv();
    const AVCodecID id = codec == Codec::kH264   ? AV_CODEC_ID_H264
                         : codec == Codec::kH265 ? AV_CODEC_ID_HEVC
                                                 : AV_CODEC_ID_MJPEG;
    const AVCodec* decoder = avcodec_find_decoder(id);
    if (decoder == nullptr) {
        throw SourceError(std::string("needs libavcodec with ") + avcodec_get_name(id));
    }
    AvPtr<AVCodecContext> context = OwnAv(avcodec_alloc_context3(decoder));
    context->thread_count = threads;
    context->thread_type = FF_THREAD_FRAME;
    context->max_pixels = std::int64_t{base::kMaxSidePixels} * base::kMaxSidePixels;
    context->lowres = halvings;
    const base::BlockedSignals blocked;
    CheckAv(avcodec_open2(context.get(), decoder, nullptr), "cannot open the decoder");
    return context;
}

std::unique_ptr<FrameDecoder> OpenFrameDecoder(Codec codec, int threads) {
    return std::make_unique<AvFrameDecoder>(codec, threads);
}

}  // namespace lookhaven::media
