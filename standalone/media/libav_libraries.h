// SPDX-License-Identifier: Apache-2.0
//
// What request processes need of libav, as shared libraries that are loaded when needed.
//
// Why so        libav adds hundreds of memory mappings, and each makes every fork more expensive. So the host, which
//               forks for each request, does without it, and only a request process that decodes or copies loads such a
//               library. There are two, since loading is most of the wait for a first picture, and decoding needs none
//               of libavformat.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/media/join.h"
#include "standalone/media/reencode.h"
#include "standalone/media/remux.h"

namespace lookhaven::media {

// Decodes a sequence of H.264 or H.265 frames and encodes chosen pictures as JPEG. One thread.
class FrameDecoder {
  public:
    virtual ~FrameDecoder() = default;

    // Discards all frames fed so far; the next one must be a key frame.
    virtual void Restart() = 0;
    // Feeds the next frame in decoding order, as Annex B or as stored in a Matroska file, with a number that Take will
    // return. An empty frame means that no more come before Restart. A frame that cannot be decoded is skipped, and one
    // that no other is made from, unless its picture is wanted.
    virtual void Feed(std::span<const std::uint8_t> frame, std::int64_t number, bool is_wanted = true) = 0;
    // The number of the next picture in presentation order; nothing when more frames must be fed first.
    virtual std::optional<std::int64_t> Take() = 0;
    // Encodes the picture last taken into the buffer and returns its size. width: made that wide, unless it is 0 or the
    // picture is no wider. Throws SourceError when it does not fit.
    virtual std::size_t Encode(std::span<std::uint8_t> jpeg, int width) = 0;
};

class DecoderLibrary {
  public:
    virtual ~DecoderLibrary() = default;

    // codec: a name as base::CodecName gives it.

    // As JpegOfKeyFrame in still.h.
    virtual std::vector<std::uint8_t> Still(std::string_view codec, std::span<const std::uint8_t> frame,
                                            std::size_t max_bytes) const = 0;
    // As ShrinkJpeg in jpeg_scaler.h.
    virtual std::vector<std::uint8_t> Shrink(std::span<const std::uint8_t> jpeg, int width) const = 0;
    // As Reencode in reencode.h.
    virtual Reencoded Reencode(std::string_view type, std::span<const std::uint8_t> file,
                               std::size_t max_bytes) const = 0;
    // Each thread beyond the first delays pictures by one more frame, so use one thread at the end of a growing
    // recording. Throws SourceError for a codec that cannot be decoded.
    virtual std::unique_ptr<FrameDecoder> OpenDecoder(std::string_view codec, int threads) const = 0;
};

class RemuxLibrary {
  public:
    virtual ~RemuxLibrary() = default;

    // As Export in remux.h.
    virtual void Copy(const std::filesystem::path& recording, int output, const ExportOptions& options) const = 0;
    // As Join and SoundOf in join.h.
    virtual bool Join(std::span<const archive::RecordingPart> parts, const JoinOptions& options,
                      const ByteSink& sink) const = 0;
    virtual std::string SoundOf(const std::filesystem::path& recording) const = 0;
};

// Lets a thread of its own begin to load the decoder library, so that LoadDecoderLibrary waits less. What fails shows
// there.
void BeginLoadingDecoderLibrary();
// These load their library for the rest of the process's life. Throw SourceError.
const DecoderLibrary& LoadDecoderLibrary();
const RemuxLibrary& LoadRemuxLibrary();

}  // namespace lookhaven::media
