// SPDX-License-Identifier: Apache-2.0
//
// Allocates entries in a segment's arena and index, for the one process that writes it.
//
// Algorithm     The arena is filled from its beginning to its end, then from the beginning again. Before a region is
//               used, the entries in it and all older ones are removed from the index. A region that a reader has
//               pinned is skipped: the next one behind it is tried, at most once through the whole arena. So a reader
//               costs the ring at most what it has pinned.
// Invariants    (1) The entries oldest_ … newest_ are live, all others are not.
//               (2) Live entries from cursor_ to the end of the arena are older than those before cursor_; within both
//               parts, entries are in the order of their age.
#pragma once

#include <cstdint>
#include <optional>

#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

class Arena {
  public:
    // This process must be the segment's writer and keep it attached. Begins a new run.
    explicit Arena(const View& view);

    // Removes every entry from the index; the counts continue.
    void StartRun();

    // A region of that many blocks without a live entry or a pin; nothing when what readers have pinned leaves no
    // space. It stays reserved until the next call.
    std::optional<Region> Reserve(std::uint32_t blocks);

    // Writes the frame to the reserved region, which must be large enough, as the newest entry.
    void Append(const Region& region, const Frame& frame, bool is_key);

    // The newest key frame of this run was overwritten: the arena does not hold a group of pictures.
    bool HasLostKeyFrame() const { return has_lost_key_frame_; }

    static std::uint32_t BlocksFor(std::size_t data_bytes) {
        return static_cast<std::uint32_t>((sizeof(Entry) + data_bytes + kBlockBytes - 1) / kBlockBytes);
    }

  private:
    bool IsEmpty() const { return oldest_ > newest_; }
    std::uint64_t OldestStart() const;
    void DropOldest();
    void DropUpTo(const Region& region);
    std::optional<Region> ChooseRegion(std::uint32_t blocks) const;

    View view_;
    ReaderTable readers_;
    std::uint64_t oldest_ = 1;
    std::uint64_t newest_ = 0;
    std::uint32_t cursor_ = 0;
    bool has_lost_key_frame_ = false;
};

}  // namespace lookhaven::ring
