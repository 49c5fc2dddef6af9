// SPDX-License-Identifier: Apache-2.0
#include "standalone/pattern/pattern_audio.h"

#include <cmath>
#include <numbers>

#include "standalone/media/libav.h"
#include "standalone/media/source.h"

extern "C" {
#include <libavutil/channel_layout.h>
}

namespace lookhaven::pattern {

namespace {

constexpr int kSampleRateHz = 48000;
constexpr int kBlockSamples = 1024;
constexpr int kPeriodBlocks = 94;  // about two seconds
constexpr int kStrokes = 2;        // per period

// Two tones that fade, the second stroke lower than the first.
float Sample(int position) {
    constexpr int kPeriodSamples = kPeriodBlocks * kBlockSamples;
    const int stroke = position % kPeriodSamples * kStrokes / kPeriodSamples;
    const double seconds = static_cast<double>(position % (kPeriodSamples / kStrokes)) / kSampleRateHz;
    const double pitch_hz = stroke == 0 ? 660 : 550;
    const double envelope = 0.05 * std::exp(-9 * seconds) * std::min(1.0, seconds * 200);
    const double angle = 2 * std::numbers::pi * pitch_hz * seconds;
    return static_cast<float>(envelope * (std::sin(angle) + 0.4 * std::sin(2 * angle)));
}

media::AvPtr<AVCodecContext> OpenEncoder() {
    const AVCodec* codec = avcodec_find_encoder(AV_CODEC_ID_AAC);
    if (codec == nullptr) {
        throw media::SourceError("needs libavcodec with AAC");
    }
    media::AvPtr<AVCodecContext> encoder = media::OwnAv(avcodec_alloc_context3(codec));
    encoder->sample_fmt = AV_SAMPLE_FMT_FLTP;
    encoder->sample_rate = kSampleRateHz;
    encoder->bit_rate = 48000;
    av_channel_layout_default(&encoder->ch_layout, 1);
    encoder->flags |= AV_CODEC_FLAG_GLOBAL_HEADER;
    media::CheckAv(avcodec_open2(encoder.get(), codec, nullptr), "cannot set up AAC");
    return encoder;
}

}  // namespace

Chime::Chime() {
    const media::AvPtr<AVCodecContext> encoder = OpenEncoder();
    format_ = {base::Codec::kAac, 0, 0,
               kSampleRateHz,     1, {encoder->extradata, encoder->extradata + encoder->extradata_size}};
    const media::AvPtr<AVPacket> packet = media::OwnAv(av_packet_alloc());
    // Each block depends on its neighbours: only the second of several periods can follow itself.
    std::vector<std::vector<std::uint8_t>> encoded;
    for (int block = 0; encoded.size() < 2 * kPeriodBlocks; ++block) {
        media::AvPtr<AVFrame> frame = media::OwnAv(av_frame_alloc());
        frame->format = encoder->sample_fmt;
        frame->nb_samples = kBlockSamples;
        frame->sample_rate = kSampleRateHz;
        av_channel_layout_copy(&frame->ch_layout, &encoder->ch_layout);
        media::CheckAv(av_frame_get_buffer(frame.get(), 0), "cannot encode sound");
        auto* samples = reinterpret_cast<float*>(frame->data[0]);
        for (int i = 0; i < kBlockSamples; ++i) {
            samples[i] = Sample(block * kBlockSamples + i);
        }
        frame->pts = std::int64_t{block} * kBlockSamples;
        media::CheckAv(avcodec_send_frame(encoder.get(), frame.get()), "cannot encode sound");
        while (avcodec_receive_packet(encoder.get(), packet.get()) >= 0) {
            encoded.emplace_back(packet->data, packet->data + packet->size);
            av_packet_unref(packet.get());
        }
    }
    blocks_.assign(std::make_move_iterator(encoded.begin() + kPeriodBlocks),
                   std::make_move_iterator(encoded.begin() + 2 * kPeriodBlocks));
}

std::span<const std::uint8_t> Chime::Block(std::int64_t number) const {
    return blocks_[static_cast<std::size_t>(number % kPeriodBlocks)];
}

std::int64_t Chime::BlockTime(std::int64_t number) const {
    return number * kBlockSamples * 1'000'000 / kSampleRateHz;
}

}  // namespace lookhaven::pattern
