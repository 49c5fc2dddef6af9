// SPDX-License-Identifier: Apache-2.0
//
// Finds the video frames of a Matroska file, finished or not. Reads element headers only, never frames.
//
// Why so        A frame index is built from what is in the file, not from what was passed to the muxer, and is rebuilt
//               the same way when it was lost.
// Invariants    Every size read from the file is checked against the file before use: no contents make this read
//               outside the file, loop forever or allocate without bound.
#pragma once

#include <cstdint>
#include <vector>

#include "standalone/archive/archive_error.h"
#include "standalone/archive/ebml_reader.h"
#include "standalone/archive/frame_index.h"

namespace lookhaven::archive {

// What the head of a Matroska file says beyond what is in an index.
struct MatroskaTracks {
    std::uint64_t timestamp_scale_ns = 1'000'000;
    // What a decoder has to know beforehand, as Matroska stores it; empty when it is missing, or larger than any is.
    std::vector<std::uint8_t> video_private;
    std::vector<std::uint8_t> audio_private;
    std::uint64_t audio_track = 0;  // 0: none of a codec that is known
};

class MatroskaBlocks {
  public:
    // Reads everything before the first cluster. Borrows the descriptor. Throws ArchiveError when this is no Matroska
    // file with a video track in a supported codec and of a possible size; std::system_error.
    explicit MatroskaBlocks(int file);

    // From the file; the reason is always 0, and the start is 0 when the file does not say.
    const IndexHeader& Header() const { return header_; }
    const MatroskaTracks& Tracks() const { return tracks_; }

    // Appends the video frames of the next complete cluster. False, without a change, when there is none (yet): the
    // file ends, is truncated, or is damaged here. May be called again after the file has grown. Throws
    // std::system_error.
    bool ReadCluster(std::vector<FrameEntry>& frames);

    // After damage: moves to the next cluster that ReadCluster can read. False, without a change, when there is none,
    // or after a thousand attempts for the whole file. Throws std::system_error.
    bool SkipDamage();

    // Where the last complete cluster ends, or what precedes the first.
    std::uint64_t Position() const { return position_; }

  private:
    void ReadHead();
    void ReadInfo(const EbmlReader::Element& info);
    void ReadTrack(const EbmlReader::Element& track);
    bool ReadFrames(const EbmlReader::Element& cluster, std::vector<FrameEntry>& frames);
    bool ReadBlock(const EbmlReader::Element& block, std::uint64_t cluster_time, bool simple,
                   std::vector<FrameEntry>& frames);

    EbmlReader ebml_;
    IndexHeader header_;
    std::uint64_t position_ = 0;
    int attempts_ = 0;  // of SkipDamage to read what looks like a cluster
    MatroskaTracks tracks_;
    std::uint64_t video_track_ = 0;
};

}  // namespace lookhaven::archive
