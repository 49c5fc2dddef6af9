// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/joiner.h"

#include <algorithm>
#include <stdexcept>
#include <string>
#include <utility>

#include <fcntl.h>

#include "standalone/archive/mount_file.h"
#include "standalone/media/libav.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kFlushMs = 1000;
// How long the last frame is shown.
constexpr std::int64_t kMaxLastFrameMs = 1000;
// Frames that are further out of order than this are damage.
constexpr std::int64_t kMaxDelayMs = 2000;

// How far frames are presented before others that are decoded earlier.
std::int64_t ReorderingMs(const std::vector<archive::FrameEntry>& frames) {
    std::int64_t latest_ms = 0;
    std::int64_t reordering_ms = 0;
    for (const archive::FrameEntry& frame : frames) {
        latest_ms = std::max<std::int64_t>(latest_ms, frame.time_ms);
        reordering_ms = std::max(reordering_ms, latest_ms - frame.time_ms);
    }
    return reordering_ms;
}

AvPtr<AVFormatContext> OpenInput(const base::FileDescriptor& file, const std::filesystem::path& path) {
    AvOptions options;
    options.Set("protocol_whitelist", "file").Set("format_whitelist", "matroska,webm");
    AVFormatContext* input = nullptr;
    const std::string url = "file:/proc/self/fd/" + std::to_string(file.Get());  // of this file, not of its path
    CheckAv(avformat_open_input(&input, url.c_str(), nullptr, options.Get()), "cannot open " + path.string());
    return AvPtr<AVFormatContext>(input);
}

int BestStream(AVFormatContext& input, AVMediaType type) {
    return av_find_best_stream(&input, type, -1, -1, nullptr, 0);
}

}  // namespace

std::string SoundOf(const std::filesystem::path& recording) {
    const base::FileDescriptor file = archive::OpenFile(recording, O_RDONLY);
    const AvPtr<AVFormatContext> input = OpenInput(file, recording);
    const int stream = BestStream(*input, AVMEDIA_TYPE_AUDIO);
    if (stream < 0) {
        return "";
    }
    const AVCodecParameters& parameters = *input->streams[stream]->codecpar;
    const std::string head(reinterpret_cast<const char*>(parameters.extradata),
                           static_cast<std::size_t>(parameters.extradata_size));
    return std::to_string(parameters.codec_id) + ' ' + std::to_string(parameters.sample_rate) + ' ' +
           std::to_string(parameters.ch_layout.nb_channels) + ' ' + head;
}

Joiner::Joiner(ContainerOutput& output, Container container, bool with_sound, std::function<void()> flushed)
    : output_(output),
      container_(container),
      with_sound_(with_sound),
      flushed_(std::move(flushed)) {}

void Joiner::Add(const archive::RecordingPart& part) {
    const std::int64_t wall_ms = part.FirstWallMs();
    try {
        Open(part);
        if (container_ == Container::kMp4) {
            PlanDecoding(part);
        }
    } catch (const std::runtime_error& error) {  // SourceError, archive::ArchiveError, std::system_error
        throw UnreadablePart(error.what(), wall_ms);
    }
    if (!begun_) {
        Begin(wall_ms);
    }
    // Even if the wall clock was set back, the later recording comes after the earlier one.
    offset_ms_ = std::max(wall_ms - start_wall_ms_, last_ms_ + 1) - part.begin_ms;
    Copy(part);
}

void Joiner::Open(const archive::RecordingPart& part) {
    input_.reset();
    file_ = archive::OpenFile(part.path, O_RDONLY);
    input_ = OpenInput(file_, part.path);
    video_ = BestStream(*input_, AVMEDIA_TYPE_VIDEO);
    audio_ = with_sound_ ? BestStream(*input_, AVMEDIA_TYPE_AUDIO) : -1;
    CheckAv(video_, part.path.string() + " has no picture");
}

void Joiner::Begin(std::int64_t wall_ms) {
    begun_ = true;
    start_wall_ms_ = wall_ms;
    to_video_ = output_.AddStream(*input_->streams[video_]->codecpar);
    to_audio_ = audio_ < 0 ? -1 : output_.AddStream(*input_->streams[audio_]->codecpar);
    output_.SetStart(wall_ms);
    output_.Begin();
}

// Frames are decoded at the times at which frames are presented, in ascending order.
void Joiner::PlanDecoding(const archive::RecordingPart& part) {
    const std::vector<archive::FrameEntry> frames = archive::FramesOf(part);
    decoding_ms_.clear();
    decoding_ms_.reserve(frames.size());
    for (const archive::FrameEntry& frame : frames) {
        decoding_ms_.push_back(frame.time_ms);
    }
    std::ranges::sort(decoding_ms_);
    next_frame_ = 0;
    delay_ms_ = begun_ ? delay_ms_ : std::min(ReorderingMs(frames), kMaxDelayMs);
}

void Joiner::Copy(const archive::RecordingPart& part) {
    if (part.begin_ms > 0) {
        const AVRational unit = input_->streams[video_]->time_base;
        av_seek_frame(input_.get(), video_, av_rescale_q(part.begin_ms, {1, 1000}, unit), AVSEEK_FLAG_BACKWARD);
    }
    std::int64_t reached_ms = part.begin_ms;
    // Frames are counted: one that is shown earlier may follow the last one.
    for (std::int64_t copied = 0; copied < part.frames;) {
        ReadPacket(part, reached_ms);
        const bool is_video = packet_->stream_index == video_;
        if ((!is_video && (packet_->stream_index != audio_ || to_audio_ < 0)) || packet_->pts == AV_NOPTS_VALUE) {
            continue;
        }
        const AVRational unit = input_->streams[packet_->stream_index]->time_base;
        const std::int64_t time_ms = av_rescale_q(packet_->pts, unit, {1, 1000});
        if (time_ms >= part.begin_ms && time_ms <= part.last_ms) {
            Write(is_video, time_ms);
            copied += is_video ? 1 : 0;
            reached_ms = is_video ? std::max(reached_ms, time_ms) : reached_ms;
        }
    }
}

void Joiner::ReadPacket(const archive::RecordingPart& part, std::int64_t reached_ms) {
    av_packet_unref(packet_.get());
    try {
        // A growing recording may end inside a frame, but only after the last frame in its index.
        CheckAv(av_read_frame(input_.get(), packet_.get()), "cannot read on in " + part.path.string());
    } catch (const SourceError& error) {
        throw UnreadablePart(error.what(), part.header.start_wall_ms + reached_ms);
    }
}

FrameTimes Joiner::TimesOf(bool is_video, std::int64_t time_ms) {
    FrameTimes times;
    times.presentation_ms = offset_ms_ + time_ms + delay_ms_;
    times.decoding_ms = times.presentation_ms;
    if (is_video && next_frame_ < decoding_ms_.size()) {
        times.decoding_ms = std::min(times.presentation_ms, offset_ms_ + decoding_ms_[next_frame_++]);
    }
    // The muxer requires them to ascend.
    const Pending& last = is_video ? pending_video_ : pending_audio_;
    if (last.packet->data != nullptr) {
        times.decoding_ms = std::max(times.decoding_ms, last.times.decoding_ms + 1);
    }
    times.presentation_ms = std::max(times.presentation_ms, times.decoding_ms);
    return times;
}

void Joiner::Postpone(bool is_video, std::int64_t time_ms) {
    Pending& pending = is_video ? pending_video_ : pending_audio_;
    FrameTimes times = TimesOf(is_video, time_ms);
    if (pending.packet->data != nullptr) {
        pending.times.duration_ms = times.decoding_ms - pending.times.decoding_ms;
        times.duration_ms = std::min(pending.times.duration_ms, kMaxLastFrameMs);
        WritePending(is_video);
    }
    av_packet_unref(pending.packet.get());
    av_packet_move_ref(pending.packet.get(), packet_.get());
    pending.times = times;
}

void Joiner::WritePending(bool is_video) {
    const Pending& pending = is_video ? pending_video_ : pending_audio_;
    const AVPacket& packet = *pending.packet;
    output_.Write(is_video ? to_video_ : to_audio_, {packet.data, static_cast<std::size_t>(packet.size)}, pending.times,
                  (packet.flags & AV_PKT_FLAG_KEY) != 0);
}

void Joiner::Finish() {
    for (const bool is_video : {true, false}) {
        if ((is_video ? pending_video_ : pending_audio_).packet->data != nullptr) {
            WritePending(is_video);
        }
    }
}

void Joiner::Write(bool is_video, std::int64_t time_ms) {
    if (container_ == Container::kMp4) {
        Postpone(is_video, time_ms);
    } else {
        output_.Write(is_video ? to_video_ : to_audio_, {packet_->data, static_cast<std::size_t>(packet_->size)},
                      offset_ms_ + time_ms, (packet_->flags & AV_PKT_FLAG_KEY) != 0);
    }
    last_ms_ = std::max(last_ms_, offset_ms_ + time_ms);
    if (last_ms_ - flushed_ms_ >= kFlushMs) {
        flushed_ms_ = last_ms_;
        output_.Flush();
        if (flushed_) {
            flushed_();
        }
    }
}

}  // namespace lookhaven::media
