// SPDX-License-Identifier: Apache-2.0
//
// Demultiplexes a container or an RTSP session into the frames of its best video and its best audio stream.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "standalone/media/annexb.h"
#include "standalone/media/frame_assembler.h"
#include "standalone/media/libav.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

class Demuxer {
  public:
    // How the input delivers frames: whole, or in pieces that each have a time.
    enum class Framing { kWhole, kPieces };

    // The deadline must outlive the demuxer; it ends every wait. Throws SourceError.
    Demuxer(const std::string& url, AvOptions& options, Deadline& deadline, Framing framing);

    const std::optional<StreamFormat>& Audio() const { return audio_; }

    // The next frame, its time in microseconds of the source's own clock; nothing at the end. Drops frames before the
    // first key frame, empty ones and those above base::kMaxFrameBytes. Throws SourceError.
    std::optional<Packet> Read();

  private:
    void ChooseVideo(Framing framing);
    void ChooseAudio();
    std::optional<Packet> Take();
    std::int64_t TimeOfPacket();
    std::optional<Packet> TakeVideo(std::int64_t time_us);
    std::optional<Packet> CompleteFrame(std::span<const std::uint8_t> frame, std::int64_t time_us);
    bool LearnFormat(std::span<const std::uint8_t> frame);

    Deadline& deadline_;
    AvPtr<AVFormatContext> input_;
    AvPtr<AVPacket> packet_;
    int video_index_ = -1;
    int audio_index_ = -1;
    AvPtr<AVBSFContext> video_filter_;         // for H.264 and H.265 in whole frames
    std::optional<FrameAssembler> assembler_;  // for H.264 and H.265 in pieces
    AvPtr<AVCodecContext> parser_codec_;
    AvPtr<AVCodecParserContext> parser_;
    std::optional<ParameterSets> parameter_sets_;
    StreamFormat video_;
    std::optional<StreamFormat> audio_;
    std::int64_t next_time_us_ = 0;  // of a packet without a time
};

}  // namespace lookhaven::media
