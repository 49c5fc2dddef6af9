// SPDX-License-Identifier: Apache-2.0
//
// Writes a Matroska file, or a stream of Matroska or MP4 to a sink for its bytes.
#pragma once

#include <memory>
#include <string>

#include "standalone/media/join.h"
#include "standalone/media/libav.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

struct FrameTimes {
    std::int64_t presentation_ms = 0;
    std::int64_t decoding_ms = 0;  // not after it
    std::int64_t duration_ms = 0;  // exact: in MP4 a Flush adds them up to where the next frame begins
};

// Call AddStream for each stream, then Begin, then Write and Flush any number of times, then End. Times are in
// milliseconds. Every call throws std::system_error with the descriptor's errno, or that of the sink, when writing
// fails, SourceError when the muxer refuses its input.
class ContainerOutput {
  public:
    // Matroska. Borrows the descriptor. If it is not seekable, sizes stay unknown and there is no seek table.
    ContainerOutput(int descriptor, bool seekable);
    // A stream. MP4 is in fragments, one for each Flush.
    ContainerOutput(ByteSink sink, Container container);
    ContainerOutput(const ContainerOutput&) = delete;
    ContainerOutput& operator=(const ContainerOutput&) = delete;

    // Returns the stream's number, for Write.
    int AddStream(const StreamFormat& format);
    int AddStream(const AVCodecParameters& parameters);
    void SetStart(std::int64_t wall_ms);

    void Begin();
    // Frames in decoding order, with their presentation times, which may go back by up to two seconds.
    void Write(int stream, std::span<const std::uint8_t> data, std::int64_t time_ms, bool key_frame);
    // With its decoding time and its duration, which MP4 stores: decoding times ascend.
    void Write(int stream, std::span<const std::uint8_t> data, const FrameTimes& times, bool key_frame);
    // Ends the cluster and writes out everything so far.
    void Flush();
    void End();

    // All in all.
    std::int64_t BytesWritten() const { return bytes_written_; }

  private:
    struct FreeContext {
        void operator()(AVFormatContext* context) const { avformat_free_context(context); }
    };
    struct FreeIo {
        void operator()(AVIOContext* io) const;
    };

    static int WriteBytes(void* self, std::uint8_t* data, int size);
    static std::int64_t Seek(void* self, std::int64_t offset, int whence);
    AVStream& NewStream();
    void Check(int result, const char* what) const;

    ContainerOutput(ByteSink sink, int descriptor, bool seekable, Container container);

    int descriptor_;
    ByteSink sink_;
    Container container_;
    int errno_ = 0;  // of the first write that failed
    std::int64_t bytes_written_ = 0;
    std::unique_ptr<AVIOContext, FreeIo> io_;
    std::unique_ptr<AVFormatContext, FreeContext> context_;
    AvPtr<AVPacket> packet_;
    std::vector<std::int64_t> decode_ms_;  // of each stream's last frame
};

}  // namespace lookhaven::media
