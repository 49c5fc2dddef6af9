// SPDX-License-Identifier: Apache-2.0
//
// Copies parts of recordings, one behind the other, into one container.
#pragma once

#include <cstdint>
#include <functional>
#include <vector>

#include "standalone/archive/recording_part.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/media/container_output.h"

namespace lookhaven::media {

class Joiner {
  public:
    // Borrows the output, which it begins with the first part. flushed: called after each second of footage.
    Joiner(ContainerOutput& output, Container container, bool with_sound, std::function<void()> flushed = {});

    // Throw SourceError, archive::ArchiveError, std::system_error. Call Finish behind the last part.
    void Add(const archive::RecordingPart& part);
    void Finish();

  private:
    void Open(const archive::RecordingPart& part);
    void Begin(std::int64_t wall_ms);
    void PlanDecoding(const archive::RecordingPart& part);
    void Copy(const archive::RecordingPart& part);
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
