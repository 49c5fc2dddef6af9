// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/demuxer.h"

#include "standalone/media/jpeg.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

std::optional<Codec> CodecOf(AVCodecID id) {
    switch (id) {
    case AV_CODEC_ID_MJPEG:
        return Codec::kMjpeg;
    case AV_CODEC_ID_H264:
        return Codec::kH264;
    case AV_CODEC_ID_HEVC:
        return Codec::kH265;
    case AV_CODEC_ID_AAC:
        return Codec::kAac;
    case AV_CODEC_ID_PCM_MULAW:
        return Codec::kPcmMulaw;
    case AV_CODEC_ID_PCM_ALAW:
        return Codec::kPcmAlaw;
    case AV_CODEC_ID_OPUS:
        return Codec::kOpus;
    default:
        return std::nullopt;
    }
}

AvPtr<AVBSFContext> OpenFilter(const char* name, const AVStream& stream) {
    AVBSFContext* filter = nullptr;
    CheckAv(av_bsf_alloc(av_bsf_get_by_name(name), &filter), name);
    AvPtr<AVBSFContext> owned(filter);
    CheckAv(avcodec_parameters_copy(owned->par_in, stream.codecpar), name);
    owned->time_base_in = stream.time_base;
    CheckAv(av_bsf_init(owned.get()), name);
    return owned;
}

std::span<const std::uint8_t> ExtraData(const AVCodecParameters& parameters) {
    return {parameters.extradata, static_cast<std::size_t>(parameters.extradata_size)};
}

std::span<const std::uint8_t> Bytes(const AVPacket& packet) {
    return {packet.data, static_cast<std::size_t>(packet.size)};
}

// Viewers learn only the name of G.711, not its rate and channels, so these must be the usual ones.
bool IsUsualForm(Codec codec, const AVCodecParameters& parameters) {
    switch (codec) {
    case Codec::kAac:
        return parameters.extradata_size > 0;
    case Codec::kPcmMulaw:
    case Codec::kPcmAlaw:
        return parameters.sample_rate == 8000 && parameters.ch_layout.nb_channels == 1;
    default:
        return codec == Codec::kOpus;
    }
}

}  // namespace

Demuxer::Demuxer(const std::string& url, AvOptions& options, Deadline& deadline, Framing framing)
    : deadline_(deadline),
      input_(OwnAv(avformat_alloc_context())),
      packet_(OwnAv(av_packet_alloc())) {
    input_->interrupt_callback = deadline.Callback();
    input_->flags |= framing == Framing::kPieces ? AVFMT_FLAG_NOPARSE : 0;
    AVFormatContext* input = input_.release();  // freed by libav when it cannot be opened
    const int opened = avformat_open_input(&input, url.c_str(), nullptr, options.Get());
    input_.reset(input);
    if (opened < 0) {
        deadline_.Check();
        CheckAv(opened, "cannot open");
    }
    if (framing == Framing::kWhole) {
        CheckAv(avformat_find_stream_info(input_.get(), nullptr), "cannot analyse");
    }
    ChooseVideo(framing);
    ChooseAudio();
}

void Demuxer::ChooseVideo(Framing framing) {
    video_index_ = av_find_best_stream(input_.get(), AVMEDIA_TYPE_VIDEO, -1, -1, nullptr, 0);
    if (video_index_ < 0) {
        throw SourceError("has no picture");
    }
    const AVStream& stream = *input_->streams[video_index_];
    const std::optional<Codec> codec = CodecOf(stream.codecpar->codec_id);
    if (!codec || !base::IsVideo(*codec)) {
        throw SourceError(std::string("sends pictures as ") + avcodec_get_name(stream.codecpar->codec_id) +
                          ", which is not supported");
    }
    video_.codec = *codec;
    if (*codec == Codec::kMjpeg) {
        return;
    }
    if (framing == Framing::kPieces) {
        assembler_.emplace(*codec);
        parameter_sets_.emplace(*codec, ExtraData(*stream.codecpar));
    } else {
        video_filter_ = OpenFilter(*codec == Codec::kH264 ? "h264_mp4toannexb" : "hevc_mp4toannexb", stream);
        parameter_sets_.emplace(*codec, ExtraData(*video_filter_->par_out));
    }
    parser_codec_ = OwnAv(avcodec_alloc_context3(nullptr));
    parser_codec_->codec_id = stream.codecpar->codec_id;
    parser_ = OwnAv(av_parser_init(stream.codecpar->codec_id));
    parser_->flags |= PARSER_FLAG_COMPLETE_FRAMES;
}

// Sound in an unknown codec is ignored: a silent picture is better than none.
void Demuxer::ChooseAudio() {
    const int index = av_find_best_stream(input_.get(), AVMEDIA_TYPE_AUDIO, -1, video_index_, nullptr, 0);
    if (index < 0) {
        return;
    }
    const AVStream& stream = *input_->streams[index];
    const AVCodecParameters& parameters = *stream.codecpar;
    const std::optional<Codec> codec = CodecOf(parameters.codec_id);
    if (!codec || !IsUsualForm(*codec, parameters)) {
        return;
    }
    audio_index_ = index;
    const std::span<const std::uint8_t> extra = ExtraData(parameters);
    audio_ = StreamFormat{
        *codec, 0, 0, parameters.sample_rate, parameters.ch_layout.nb_channels, {extra.begin(), extra.end()}};
}

std::optional<Packet> Demuxer::Read() {
    for (;;) {
        deadline_.Check();
        av_packet_unref(packet_.get());
        const int result = av_read_frame(input_.get(), packet_.get());
        deadline_.Check();
        if (result == AVERROR_EOF) {
            return std::nullopt;
        }
        CheckAv(result, "cannot read on");
        if (std::optional<Packet> packet = Take()) {
            return packet;
        }
    }
}

std::optional<Packet> Demuxer::Take() {
    const bool is_video = packet_->stream_index == video_index_;
    if (!is_video && packet_->stream_index != audio_index_) {
        return std::nullopt;
    }
    const std::int64_t time_us = TimeOfPacket();
    std::optional<Packet> packet;
    if (is_video) {
        packet = TakeVideo(time_us);
    } else if (video_.width > 0) {
        packet = Packet{Medium::kAudio, Bytes(*packet_), time_us, true, &*audio_};
    }
    if (!packet || packet->data.empty() || packet->data.size() > base::kMaxFrameBytes) {
        return std::nullopt;
    }
    if (is_video) {
        deadline_.Rearm();
    }
    return packet;
}

// Raw streams carry no times: frames follow each other at the rate that the stream names, or at 25 per second.
std::int64_t Demuxer::TimeOfPacket() {
    constexpr std::int64_t kUsualFrameUs = 40'000;
    const AVRational unit = input_->streams[packet_->stream_index]->time_base;
    const std::int64_t time = packet_->pts != AV_NOPTS_VALUE ? packet_->pts : packet_->dts;
    const std::int64_t time_us = time != AV_NOPTS_VALUE ? av_rescale_q(time, unit, AV_TIME_BASE_Q) : next_time_us_;
    const std::int64_t length_us = av_rescale_q(packet_->duration, unit, AV_TIME_BASE_Q);
    next_time_us_ = time_us + (length_us > 0 ? length_us : kUsualFrameUs);
    return time_us;
}

std::optional<Packet> Demuxer::TakeVideo(std::int64_t time_us) {
    if (assembler_) {
        const std::optional<FrameAssembler::Frame> frame = assembler_->Add(Bytes(*packet_), time_us);
        return frame ? CompleteFrame(frame->data, frame->time_us) : std::nullopt;
    }
    if (video_filter_ != nullptr && (av_bsf_send_packet(video_filter_.get(), packet_.get()) < 0 ||
                                     av_bsf_receive_packet(video_filter_.get(), packet_.get()) < 0)) {
        return std::nullopt;  // one damaged frame
    }
    return CompleteFrame(Bytes(*packet_), time_us);
}

std::optional<Packet> Demuxer::CompleteFrame(std::span<const std::uint8_t> frame, std::int64_t time_us) {
    Packet packet{Medium::kVideo, frame, time_us, true, &video_};
    if (parameter_sets_) {
        packet.key_frame = IsKeyFrame(video_.codec, frame);
        packet.data = packet.key_frame ? parameter_sets_->Complete(frame) : frame;
    }
    if (packet.key_frame && !LearnFormat(packet.data)) {
        return std::nullopt;
    }
    return video_.width > 0 ? std::optional(packet) : std::nullopt;
}

// Sizes are taken from the frames, since session descriptions often lack them and are sometimes wrong.
bool Demuxer::LearnFormat(std::span<const std::uint8_t> frame) {
    if (!parameter_sets_) {
        const std::optional<PictureSize> size = JpegSize(frame);
        video_.width = size ? size->width : video_.width;
        video_.height = size ? size->height : video_.height;
        return size.has_value();
    }
    std::uint8_t* parsed = nullptr;
    int parsed_size = 0;
    av_parser_parse2(parser_.get(), parser_codec_.get(), &parsed, &parsed_size, frame.data(),
                     static_cast<int>(frame.size()), AV_NOPTS_VALUE, AV_NOPTS_VALUE, 0);
    if (!PictureSize{parser_->width, parser_->height}.IsUsable()) {
        return false;
    }
    video_.width = parser_->width;
    video_.height = parser_->height;
    video_.extra_data = parameter_sets_->Current();
    return true;
}

}  // namespace lookhaven::media
