// SPDX-License-Identifier: Apache-2.0
//
// Reads any frame of a recording as a JPEG picture.
//
// Why so        A Motion JPEG frame is one read from the file, without libav. Other codecs are decoded from the key
//               frame before. The decoder keeps its state, so consecutive frames are decoded once, and a jump forward
//               continues from here or from a later key frame, whichever is nearer. A second thread decodes ahead,
//               except at the end of a growing recording.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "standalone/archive/recording_reader.h"
#include "standalone/media/libav_libraries.h"

namespace lookhaven::media {

class PictureReader {
  public:
    // The recording must outlive the reader; it may be refreshed between calls.
    explicit PictureReader(const archive::RecordingReader& recording) : recording_(recording) {}

    // Stores the picture of a valid index in the buffer and returns its size. One of Motion JPEG that does not fit is
    // encoded again, with shorter sides where needed. Throws SourceError when it cannot be decoded or does not fit,
    // archive::ArchiveError, std::system_error.
    std::size_t Read(int index, std::span<std::uint8_t> buffer);

  private:
    std::size_t ReadSmaller(std::uint32_t segment, const archive::FrameEntry& entry, std::span<std::uint8_t> buffer);
    void Seek(std::uint32_t segment, std::uint32_t entry);
    void Decode(std::uint32_t entry);

    const archive::RecordingReader& recording_;
    std::unique_ptr<FrameDecoder> decoder_;
    std::string codec_;  // the decoder's
    std::vector<std::uint8_t> bytes_;
    bool is_inside_ = false;  // the decoder continues at next_ of segment_
    std::uint32_t segment_ = 0;
    std::uint32_t next_ = 0;   // the entry to feed next
    std::int64_t shown_ = -1;  // the entry whose picture was taken last; -1 for none
};

}  // namespace lookhaven::media
