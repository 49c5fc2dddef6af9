// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/matroska_output.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <limits>
#include <system_error>

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

void MatroskaOutput::FreeIo::operator()(AVIOContext* io) const {
    av_freep(&io->buffer);
    avio_context_free(&io);
}

MatroskaOutput::MatroskaOutput(int descriptor, bool seekable) : descriptor_(descriptor) {
    PrepareAv();
    auto* buffer = static_cast<std::uint8_t*>(av_malloc(kBufferBytes));
    io_.reset(avio_alloc_context(buffer, kBufferBytes, 1, this, nullptr, WriteBytes, seekable ? Seek : nullptr));
    AVFormatContext* context = nullptr;
    CheckAv(avformat_alloc_output_context2(&context, nullptr, "matroska", nullptr), "needs libavformat with Matroska");
    context_.reset(context);
    if (io_ == nullptr) {
        av_free(buffer);
        throw std::bad_alloc();
    }
    context_->pb = io_.get();
    context_->avoid_negative_ts = AVFMT_AVOID_NEG_TS_DISABLED;
    packet_ = OwnAv(av_packet_alloc());
}

int MatroskaOutput::WriteBytes(void* self, std::uint8_t* data, int size) {
    auto& output = *static_cast<MatroskaOutput*>(self);
    if (!base::WriteAll(output.descriptor_, data, static_cast<std::size_t>(size))) {
        output.errno_ = output.errno_ == 0 ? errno : output.errno_;
        return AVERROR(output.errno_);
    }
    output.bytes_written_ += size;
    return size;
}

std::int64_t MatroskaOutput::Seek(void* self, std::int64_t offset, int whence) {
    if (whence == AVSEEK_SIZE) {
        return AVERROR(ENOSYS);
    }
    const off_t position = ::lseek(static_cast<MatroskaOutput*>(self)->descriptor_, offset, whence);
    return position < 0 ? AVERROR(errno) : position;
}

void MatroskaOutput::Check(int result, const char* what) const {
    const int failure = errno_ != 0 ? errno_ : io_->error < 0 ? EIO : 0;
    if (failure != 0) {
        throw std::system_error(failure, std::generic_category(), what);
    }
    CheckAv(result, what);
}

AVStream& MatroskaOutput::NewStream() {
    AVStream* stream = avformat_new_stream(context_.get(), nullptr);
    if (stream == nullptr) {
        throw std::bad_alloc();
    }
    stream->time_base = {1, 1000};
    decode_ms_.push_back(std::numeric_limits<std::int64_t>::min());
    return *stream;
}

int MatroskaOutput::AddStream(const StreamFormat& format) {
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

int MatroskaOutput::AddStream(const AVCodecParameters& parameters) {
    AVStream& stream = NewStream();
    CheckAv(avcodec_parameters_copy(stream.codecpar, &parameters), "cannot copy a stream");
    stream.codecpar->codec_tag = 0;
    return stream.index;
}

void MatroskaOutput::SetStart(std::int64_t wall_ms) {
    av_dict_set(&context_->metadata, "creation_time", base::FormatUtc(wall_ms).c_str(), 0);
}

void MatroskaOutput::Begin() {
    AvOptions options;
    // Neither our readers nor players look at checksums, and each byte of footage would go through them.
    options.Set("cluster_time_limit", "1000").Set("write_crc32", "0");
    Check(avformat_write_header(context_.get(), options.Get()), "cannot write a recording's head");
    avio_flush(io_.get());
    Check(0, "cannot write a recording's head");
}

void MatroskaOutput::Write(int stream, std::span<const std::uint8_t> data, std::int64_t time_ms, bool key_frame) {
    // The muxer requires decoding times that never decrease and are not after presentation times; it stores none of
    // them.
    std::int64_t& decode_ms = decode_ms_.at(static_cast<std::size_t>(stream));
    decode_ms = std::max(decode_ms, time_ms - kMaxReorderingMs);
    packet_->data = const_cast<std::uint8_t*>(data.data());
    packet_->size = static_cast<int>(data.size());
    packet_->pts = std::max(time_ms, decode_ms);
    packet_->dts = decode_ms;
    packet_->stream_index = stream;
    packet_->flags = key_frame ? AV_PKT_FLAG_KEY : 0;
    const int result = av_write_frame(context_.get(), packet_.get());
    packet_->data = nullptr;
    packet_->size = 0;
    Check(result, "cannot write a recording");
}

void MatroskaOutput::Flush() {
    const int result = av_write_frame(context_.get(), nullptr);
    avio_flush(io_.get());
    Check(result, "cannot write a recording");
}

void MatroskaOutput::End() {
    const int result = av_write_trailer(context_.get());
    avio_flush(io_.get());
    Check(result, "cannot finish a recording");
}

}  // namespace lookhaven::media
