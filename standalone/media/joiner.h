// SPDX-License-Identifier: Apache-2.0
//
// Copies parts of recordings, one after the other, into one container.
#pragma once

#include <cstdint>
#include <functional>
#include <vector>

#include "standalone/archive/recording_part.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/media/container_output.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

// Why a part cannot be opened, or not read to its end.
class UnreadablePart : public SourceError {
  public:
    UnreadablePart(const std::string& sentence, std::int64_t from_wall_ms)
        : SourceError(sentence),
          from_wall_ms_(from_wall_ms) {}
    // The part is in the output up to there.
    std::int64_t FromWallMs() const { return from_wall_ms_; }

  private:
    std::int64_t from_wall_ms_;
};

class Joiner {
  public:
    // Borrows the output, which it begins with the first part. flushed: called after each second of footage.
    Joiner(ContainerOutput& output, Container container, bool with_sound, std::function<void()> flushed = {});

    // Throw UnreadablePart, after which the next part can be added; SourceError and std::system_error of the output.
    // Call Finish behind the last part.
    void Add(const archive::RecordingPart& part);
    void Finish();
    // Whether there was a part that could be opened.
    bool HasBegun() const { return begun_; }

  private:
    void Open(const archive::RecordingPart& part);
    void Begin(std::int64_t wall_ms);
    void PlanDecoding(const archive::RecordingPart& part);
    void Copy(const archive::RecordingPart& part);
    void ReadPacket(const archive::RecordingPart& part, std::int64_t reached_ms);
    // MP4 stores durations, so a packet is written when its stream's next one is known.
    struct Pending {
        AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
        FrameTimes times;
    };

    void Write(bool is_video, std::int64_t time_ms);
    void Postpone(bool is_video, std::int64_t time_ms);
    void WritePending(bool is_video);
    FrameTimes TimesOf(bool is_video, std::int64_t time_ms);

    ContainerOutput& output_;
    Container container_;
    bool with_sound_;
    std::function<void()> flushed_;
    bool begun_ = false;
    std::int64_t start_wall_ms_ = 0;
    std::int64_t offset_ms_ = 0;  // of the part's times in the file
    std::int64_t last_ms_ = -1;
    std::int64_t flushed_ms_ = 0;
    std::int64_t delay_ms_ = 0;              // MP4: of presentation, so that decoding comes first
    std::vector<std::int64_t> decoding_ms_;  // MP4: of the part's frames
    std::size_t next_frame_ = 0;
    Pending pending_video_;
    Pending pending_audio_;
    base::FileDescriptor file_;
    AvPtr<AVFormatContext> input_;
    AvPtr<AVPacket> packet_ = OwnAv(av_packet_alloc());
    int video_ = -1;
    int audio_ = -1;
    int to_video_ = -1;
    int to_audio_ = -1;
};

}  // namespace lookhaven::media
