// SPDX-License-Identifier: Apache-2.0
//
// What request processes need of libav, as shared libraries that only they load.
//
// Why so        libav brings hundreds of mappings along, and each of them makes every fork dearer. A host that forks for
//               each request loads such a library in the one request process that decodes or copies. There are two, since
//               loading is most of the wait for a first picture, and decoding does well without libav's formats of files.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "standalone/media/remux.h"

namespace lookhaven::media {

// Decodes a row of H.264 or H.265 frames and makes JPEG pictures of the ones that are asked for. To be used by one thread.
class FrameDecoder {
  public:
    virtual ~FrameDecoder() = default;

    // Forgets what came; the next frame is a key frame.
    virtual void Restart() = 0;
    // Takes the next frame in the order of decoding, as Annex B or as it lies in a Matroska file, and a number for it; an
    // empty frame means that no more come before Restart. A frame that cannot be decoded is passed over.
    virtual void Feed(std::span<const std::uint8_t> frame, std::int64_t number) = 0;
    // The number of the next picture in the order of showing; nothing when more frames are needed first.
    virtual std::optional<std::int64_t> Take() = 0;
    // Stores the taken picture as JPEG and returns its size. Throws SourceError when it does not fit.
    virtual std::size_t Encode(std::span<std::uint8_t> jpeg) = 0;
};

class DecoderLibrary {
  public:
    virtual ~DecoderLibrary() = default;

    // Codecs are spelled as CodecName does.

    // As JpegOfKeyFrame of still.h.
    virtual std::vector<std::uint8_t> Still(std::string_view codec, std::span<const std::uint8_t> frame) const = 0;
    // With more threads than one, pictures come so many frames later as there are others: not for a row that grows at its
    // end. Throws SourceError for a codec that cannot be decoded.
    virtual std::unique_ptr<FrameDecoder> OpenDecoder(std::string_view codec, int threads) const = 0;
};

class RemuxLibrary {
  public:
    virtual ~RemuxLibrary() = default;

    // As Export of remux.h.
    virtual void Copy(const std::filesystem::path& recording, int output, const ExportOptions& options) const = 0;
};

// These load their library for the rest of the process's life. Throw SourceError.
const DecoderLibrary& LoadDecoderLibrary();
const RemuxLibrary& LoadRemuxLibrary();

}  // namespace lookhaven::media
