// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/stream_rings.h"

#include <algorithm>
#include <bit>

#include "standalone/base/clock.h"

namespace lookhaven::recorder {

namespace {

constexpr int kUsualFramesPerSecond = 25;
constexpr std::int64_t kAudioBitsPerSecond = 128'000;

ring::StreamFormat RingFormat(const media::StreamFormat& format) {
    const bool is_video = format.width > 0;
    return {base::CodecName(format.codec), format.extra_data, format.width, format.height,
            !is_video || format.codec == base::Codec::kMjpeg};
}

// Goes by the picture's size more than by its contents, so that a restarted recorder comes to the same ring.
ring::StreamEstimate VideoEstimate(const media::StreamFormat& format, std::size_t first_frame_bytes) {
    const std::int64_t pixels = std::int64_t{format.width} * format.height;
    const auto usual_bytes = static_cast<std::uint64_t>(pixels) / 8;
    const auto frame_bytes =
        static_cast<std::int64_t>(std::bit_ceil(std::max<std::uint64_t>(usual_bytes, first_frame_bytes)));
    const bool is_mjpeg = format.codec == base::Codec::kMjpeg;
    return {base::Medium::kVideo, is_mjpeg, is_mjpeg ? frame_bytes * 8 * kUsualFramesPerSecond : pixels * 4,
            frame_bytes, kUsualFramesPerSecond};
}

std::int64_t CaptureMillis(std::int64_t timestamp_us) {
    const std::int64_t age_us = std::max<std::int64_t>(0, base::MonotonicMicros() - timestamp_us);
    return base::WallMillis() - age_us / 1000;
}

}  // namespace

void StreamRings::Write(const media::Packet& packet, const std::optional<media::StreamFormat>& audio) {
    const ring::Frame frame{packet.data, 0, packet.key_frame, packet.timestamp_us, CaptureMillis(packet.timestamp_us)};
    if (packet.medium == base::Medium::kAudio) {
        if (audio_) {
            audio_->writer.Write(frame);
        }
        return;
    }
    if (!video_format_ || *video_format_ != *packet.format) {
        if (!video_format_) {
            OpenAudio(audio, packet.format->codec);
        }
        Open(video_, base::Medium::kVideo, RingFormat(*packet.format),
             VideoEstimate(*packet.format, packet.data.size()));
        video_format_ = *packet.format;
    }
    video_->writer.Write(frame);
}

void StreamRings::EndRun() {
    video_format_.reset();
    for (std::optional<Ring>* ring : {&video_, &audio_}) {
        if (*ring) {
            (*ring)->writer.StartRun();
        }
    }
}

void StreamRings::Close() {
    video_format_.reset();
    video_.reset();
    audio_.reset();
}

void StreamRings::Beat() {
    for (std::optional<Ring>* ring : {&video_, &audio_}) {
        if (*ring) {
            (*ring)->writer.Beat();
        }
    }
}

void StreamRings::OpenAudio(const std::optional<media::StreamFormat>& audio, base::Codec video_codec) {
    if (!audio && video_codec == base::Codec::kMjpeg) {
        audio_.reset();
        return;
    }
    ring::StreamFormat format = audio ? RingFormat(*audio) : ring::StreamFormat{};
    format.every_frame_is_key = true;
    Open(audio_, base::Medium::kAudio, format, {base::Medium::kAudio, true, kAudioBitsPerSecond, 0, 0});
}

// A ring of another format is retired first: its size was that of other frames.
void StreamRings::Open(std::optional<Ring>& ring, base::Medium medium, const ring::StreamFormat& format,
                       const ring::StreamEstimate& estimate) {
    if (ring && ring->format == format) {
        return;
    }
    ring.reset();
    const ring::StreamId id{stream_.camera, stream_.stream, medium};
    ring.emplace(Ring{format, ring::Writer(installation_, id, format, ring::GeometryFor(estimate))});
}

}  // namespace lookhaven::recorder
