// SPDX-License-Identifier: Apache-2.0
//
// Writes a Matroska file or stream to a descriptor.
#pragma once

#include <memory>
#include <string>

#include "standalone/media/libav.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

// Call AddStream for each stream, then Begin, then Write and Flush any number of times, then End. Times are in
// milliseconds. Every call throws std::system_error with the descriptor's errno when writing fails, SourceError when
// the muxer refuses its input.
class MatroskaOutput {
  public:
    // Borrows the descriptor. If it is not seekable, sizes stay unknown and there is no seek table.
    MatroskaOutput(int descriptor, bool seekable);
    MatroskaOutput(const MatroskaOutput&) = delete;
    MatroskaOutput& operator=(const MatroskaOutput&) = delete;

    // Returns the stream's number, for Write.
    int AddStream(const StreamFormat& format);
    int AddStream(const AVCodecParameters& parameters);
    void SetStart(std::int64_t wall_ms);

    void Begin();
    // Frames in decoding order, with their presentation times, which may go back by up to two seconds.
    void Write(int stream, std::span<const std::uint8_t> data, std::int64_t time_ms, bool key_frame);
    // Ends the cluster and writes out everything so far.
    void Flush();
    void End();

    // To the descriptor, all in all.
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

    int descriptor_;
    int errno_ = 0;  // of the first write that failed
    std::int64_t bytes_written_ = 0;
    std::unique_ptr<AVIOContext, FreeIo> io_;
    std::unique_ptr<AVFormatContext, FreeContext> context_;
    AvPtr<AVPacket> packet_;
    std::vector<std::int64_t> decode_ms_;  // of each stream's last frame
};

}  // namespace lookhaven::media
