// SPDX-License-Identifier: Apache-2.0
//
// Finds the sound of a recording between two of its video frames.
//
// Why so        The index has video frames only. Blocks follow each other in the file, so what lies between two frames
//               is a few headers and blocks of sound: walking over them needs neither the beginning of the cluster nor
//               an index of its own, and a damaged stretch costs the sound in it alone.
// Invariants    No contents make this read outside the file, loop forever or allocate without bound.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "standalone/archive/ebml_reader.h"
#include "standalone/archive/frame_index.h"
#include "standalone/archive/matroska_blocks.h"

namespace lookhaven::archive {

struct SoundBlock {
    std::uint64_t offset = 0;  // of its first byte in the recording
    std::uint32_t size = 0;    // bytes, 1 … base::kMaxFrameBytes
    std::int64_t time_ms = 0;  // from the recording's start
};

class SoundBlocks {
  public:
    // Borrows the descriptor. tracks: as MatroskaBlocks tells them of that file.
    SoundBlocks(int file, const MatroskaTracks& tracks);

    // The blocks between the end of a frame and the next frame in the file, which begins at that offset, in file order.
    // Empty where there are none, or nothing is in between that can be read. Throws std::system_error.
    std::vector<SoundBlock> Between(const FrameEntry& frame, std::uint64_t next_offset);

  private:
    std::int64_t ClusterTimeOf(const FrameEntry& frame);
    void AddBlock(const EbmlReader::Element& block, std::int64_t cluster_time, const FrameEntry& frame,
                  std::vector<SoundBlock>& found);

    EbmlReader ebml_;
    std::uint64_t timestamp_scale_ns_;
    std::uint64_t track_;
};

}  // namespace lookhaven::archive
