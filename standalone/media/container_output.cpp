// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/container_output.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <limits>
#include <system_error>
#include <utility>

#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/io.h"
#include "standalone/media/source.h"

extern "C" {
#include <libavutil/channel_layout.h>
#include <libavutil/mem.h>
}

namespace lookhaven::media {

namespace {

constexpr int kBufferBytes = 1 << 18;
constexpr std::int64_t kMaxReorderingMs = 2000;

AVCodecID AvCodecOf(Codec codec) {
    switch (codec) {
    case Codec::kMjpeg:
        return AV_CODEC_ID_MJPEG;
    case Codec::kH264:
        return AV_CODEC_ID_H264;
    case Codec::kH265:
        return AV_CODEC_ID_HEVC;
    case Codec::kAac:
        return AV_CODEC_ID_AAC;
    case Codec::kPcmMulaw:
        return AV_CODEC_ID_PCM_MULAW;
    case Codec::kPcmAlaw:
        return AV_CODEC_ID_PCM_ALAW;
    case Codec::kOpus:
        return AV_CODEC_ID_OPUS;
    }
    return AV_CODEC_ID_NONE;
}

// The header that containers need for Opus and network streams lack: channels, and 80 ms that decoders skip.
std::vector<std::uint8_t> OpusHead(const StreamFormat& format) {
    std::vector<std::uint8_t> head{'O', 'p', 'u', 's', 'H',
                                   'e', 'a', 'd', 1,   static_cast<std::uint8_t>(format.channels)};
    const std::array<std::uint8_t, 9> rest{0x38, 0x01, 0x80, 0xBB, 0, 0, 0, 0, 0};
    head.insert(head.end(), rest.begin(), rest.end());
    return head;
}

void SetExtraData(AVCodecParameters& parameters, const std::vector<std::uint8_t>& data) {
    if (data.empty()) {
        return;
    }
    parameters.extradata = static_cast<std::uint8_t*>(av_mallocz(data.size() + AV_INPUT_BUFFER_PADDING_SIZE));
    if (parameters.extradata == nullptr) {
        throw std::bad_alloc();
    }
    std::copy(data.begin(), data.end(), parameters.extradata);
    parameters.extradata_size = static_cast<int>(data.size());
}

}  // namespace

void ContainerOutput::FreeIo::operator()(AVIOContext* io) const {
    av_freep(&io->buffer);
    avio_context_free(&io);
}

ContainerOutput::ContainerOutput(int descriptor, bool seekable)
    : ContainerOutput([descriptor](auto bytes) { return base::WriteAll(descriptor, bytes.data(), bytes.size()); },
                      descriptor, seekable, Container::kMatroska) {}

ContainerOutput::ContainerOutput(ByteSink sink, Container container)
    : ContainerOutput(std::move(sink), -1, false, container) {}

ContainerOutput::ContainerOutput(ByteSink sink, int descriptor, bool seekable, Container container)
    : descriptor_(descriptor),
      sink_(std::move(sink)),
      container_(container) {
    PrepareAv();
    auto* buffer = static_cast<std::uint8_t*>(av_malloc(kBufferBytes));
    io_.reset(avio_alloc_context(buffer, kBufferBytes, 1, this, nullptr, WriteBytes, seekable ? Seek : nullptr));
    AVFormatContext* context = nullptr;
    const char* name = container == Container::kMp4 ? "mp4" : "matroska";
    CheckAv(avformat_alloc_output_context2(&context, nullptr, name, nullptr), "libavformat lacks a container");
    context_.reset(context);
    if (io_ == nullptr) {
        av_free(buffer);
        throw std::bad_alloc();
    }
    context_->pb = io_.get();
    context_->avoid_negative_ts = AVFMT_AVOID_NEG_TS_DISABLED;
    packet_ = OwnAv(av_packet_alloc());
}

int ContainerOutput::WriteBytes(void* self, std::uint8_t* data, int size) {
    auto& output = *static_cast<ContainerOutput*>(self);
    if (!output.sink_({data, static_cast<std::size_t>(size)})) {
        output.errno_ = output.errno_ == 0 ? errno : output.errno_;
        return AVERROR(output.errno_);
    }
    output.bytes_written_ += size;
    return size;
}

std::int64_t ContainerOutput::Seek(void* self, std::int64_t offset, int whence) {
    if (whence == AVSEEK_SIZE) {
        return AVERROR(ENOSYS);
    }
    const off_t position = ::lseek(static_cast<ContainerOutput*>(self)->descriptor_, offset, whence);
    return position < 0 ? AVERROR(errno) : position;
}

void ContainerOutput::Check(int result, const char* what) const {
    const int failure = errno_ != 0 ? errno_ : io_->error < 0 ? EIO : 0;
    if (failure != 0) {
        throw std::system_error(failure, std::generic_category(), what);
    }
    CheckAv(result, what);
}

AVStream& ContainerOutput::NewStream() {
    AVStream* stream = avformat_new_stream(context_.get(), nullptr);
    if (stream == nullptr) {
        throw std::bad_alloc();
    }
    stream->time_base = {1, 1000};
    decode_ms_.push_back(std::numeric_limits<std::int64_t>::min());
    return *stream;
}

int ContainerOutput::AddStream(const StreamFormat& format) {
    AVStream& stream = NewStream();
    AVCodecParameters& parameters = *stream.codecpar;
    const bool is_video = format.width > 0;
    parameters.codec_type = is_video ? AVMEDIA_TYPE_VIDEO : AVMEDIA_TYPE_AUDIO;
    parameters.codec_id = AvCodecOf(format.codec);
    parameters.width = format.width;
    parameters.height = format.height;
    if (!is_video) {
        parameters.sample_rate = format.sample_rate_hz;
        av_channel_layout_default(&parameters.ch_layout, format.channels);
        parameters.bits_per_coded_sample = av_get_bits_per_sample(parameters.codec_id);
        parameters.block_align = parameters.bits_per_coded_sample / 8 * format.channels;
    }
    const bool lacks_head = format.codec == Codec::kOpus && format.extra_data.empty();
    SetExtraData(parameters, lacks_head ? OpusHead(format) : format.extra_data);
    return stream.index;
}

int ContainerOutput::AddStream(const AVCodecParameters& parameters) {
    AVStream& stream = NewStream();
    CheckAv(avcodec_parameters_copy(stream.codecpar, &parameters), "cannot copy a stream");
    // Apple's players take no other tag for H.265.
    const bool is_h265_in_mp4 = container_ == Container::kMp4 && parameters.codec_id == AV_CODEC_ID_HEVC;
    stream.codecpar->codec_tag = is_h265_in_mp4 ? MKTAG('h', 'v', 'c', '1') : 0;
    return stream.index;
}

void ContainerOutput::SetStart(std::int64_t wall_ms) {
    av_dict_set(&context_->metadata, "creation_time", base::FormatUtc(wall_ms).c_str(), 0);
}

void ContainerOutput::Begin() {
    AvOptions options;
    if (container_ == Container::kMp4) {
        options.Set("movflags", "frag_custom+empty_moov+default_base_moof");
    } else {
        // Neither our readers nor players look at checksums, and each byte of footage would go through them.
        options.Set("cluster_time_limit", "1000").Set("write_crc32", "0");
    }
    Check(avformat_write_header(context_.get(), options.Get()), "cannot write a recording's head");
    avio_flush(io_.get());
    Check(0, "cannot write a recording's head");
}

void ContainerOutput::Write(int stream, std::span<const std::uint8_t> data, std::int64_t time_ms, bool key_frame) {
    // The muxer requires decoding times that never decrease and are not after presentation times; it stores none of
    // them.
    const std::int64_t decode_ms =
        std::max(decode_ms_.at(static_cast<std::size_t>(stream)), time_ms - kMaxReorderingMs);
    Write(stream, data, {.presentation_ms = time_ms, .decoding_ms = decode_ms}, key_frame);
}

void ContainerOutput::Write(int stream, std::span<const std::uint8_t> data, const FrameTimes& times, bool key_frame) {
    std::int64_t& decode_ms = decode_ms_.at(static_cast<std::size_t>(stream));
    decode_ms = times.decoding_ms;
    packet_->data = const_cast<std::uint8_t*>(data.data());
    packet_->size = static_cast<int>(data.size());
    packet_->pts = std::max(times.presentation_ms, decode_ms);
    packet_->dts = decode_ms;
    packet_->duration = times.duration_ms;
    // The muxer of MP4 has finer units.
    av_packet_rescale_ts(packet_.get(), {1, 1000}, context_->streams[stream]->time_base);
    packet_->stream_index = stream;
    packet_->flags = key_frame ? AV_PKT_FLAG_KEY : 0;
    const int result = av_write_frame(context_.get(), packet_.get());
    packet_->data = nullptr;
    packet_->size = 0;
    Check(result, "cannot write a recording");
}

void ContainerOutput::Flush() {
    const int result = av_write_frame(context_.get(), nullptr);
    avio_flush(io_.get());
    Check(result, "cannot write a recording");
}

void ContainerOutput::End() {
    const int result = av_write_trailer(context_.get());
    avio_flush(io_.get());
    Check(result, "cannot finish a recording");
}

}  // namespace lookhaven::media
