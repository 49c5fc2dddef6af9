// SPDX-License-Identifier: Apache-2.0
//
// The reader table of a segment: which processes read, and which region of the arena each reader has pinned.
//
// Thread safety Any thread and process.
#pragma once

#include <span>

#include "standalone/ring/segment.h"

namespace lookhaven::ring {

class ReaderTable {
  public:
    explicit ReaderTable(const View& view) : slots_(view.Readers()) {}

    // Claims a slot for this process; -1 when living readers hold them all. Slots of dead readers are taken over only
    // when none is free.
    int Claim();
    // Unpins and frees the slot, if this process owns it.
    void Release(int reader);
    // The slot, null unless this process owns it.
    ReaderSlot* Own(int reader) const;

    // The highest end, in blocks, of living readers' pins that overlap the region; 0 when there are none. Frees the
    // slots of dead readers whose pins overlap it.
    std::uint64_t PinnedUntil(const Region& region) const;

    std::uint32_t Used() const;

  private:
    std::span<ReaderSlot> slots_;
};

}  // namespace lookhaven::ring
