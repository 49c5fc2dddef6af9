// SPDX-License-Identifier: Apache-2.0
//
// Places entries in a segment's arena and index, for the one process that writes it.
//
// Algorithm     The arena fills from its beginning to its end and again. Before a region is used, the entries in it and
//               all older ones leave the index. A region that a reader has pinned is skipped: the next place behind it is
//               tried, once round the arena. So a reader costs the ring at most what it holds pinned.
// Invariants    (1) The entries oldest_ … newest_ are live, all others are not.
//               (2) Live entries from cursor_ to the end of the arena are older than those before cursor_, and within
//               both parts later places are younger.
#pragma once

#include <cstdint>
#include <optional>

#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment.h"
#include "standalone/ring/writer.h"

namespace lookhaven::ring {

class Arena {
  public:
    // The segment must be this process's to write and stay attached. Begins a new run in it.
    explicit Arena(const View& view);

    // Takes every entry out of the index; the counts go on.
    void StartRun();

    // A place of that many blocks that nobody reads, with no live entry in it; nothing when what readers hold leaves no
    // room. It is the caller's until the next call.
    std::optional<Place> MakeRoom(std::uint32_t blocks);

    // Fills the place, which holds the frame, and makes it the newest entry.
    void Append(const Place& place, const Frame& frame, bool is_key);

    // The newest key frame of this run had to make room: the arena does not hold a group of pictures.
    bool HasLostKeyFrame() const { return has_lost_key_frame_; }

    static std::uint32_t BlocksFor(std::size_t data_bytes) {
        return static_cast<std::uint32_t>((sizeof(Entry) + data_bytes + kBlockBytes - 1) / kBlockBytes);
    }

  private:
    bool IsEmpty() const { return oldest_ > newest_; }
    std::uint64_t OldestStart() const;
    void DropOldest();
    void DropUpTo(const Place& place);
    std::optional<Place> ChoosePlace(std::uint32_t blocks) const;

    View view_;
    ReaderTable readers_;
    std::uint64_t oldest_ = 1;
    std::uint64_t newest_ = 0;
    std::uint32_t cursor_ = 0;
    bool has_lost_key_frame_ = false;
};

}  // namespace lookhaven::ring
