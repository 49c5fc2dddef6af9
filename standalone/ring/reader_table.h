// SPDX-License-Identifier: Apache-2.0
//
// The table of a ring's readers: who holds a place, and which region of the arena each is sending.
//
// Thread safety Any thread and process.
#pragma once

#include <span>

#include "standalone/ring/segment.h"

namespace lookhaven::ring {

class ReaderTable {
  public:
    explicit ReaderTable(const View& view) : slots_(view.Readers()) {}

    // A place owned by this process, or -1 when living readers hold them all. Dead readers' places are taken over only
    // when no place is free.
    int Claim();
    // Unpins and frees the place.
    void Release(int reader);
    // The place if this process owns it, else null.
    ReaderSlot* Own(int reader) const;

    // Where the pins of living readers that overlap the place end, in blocks; 0 when there are none. Frees the places of
    // dead readers that it finds in the way.
    std::uint64_t PinnedUntil(const Place& place) const;

    std::uint32_t Used() const;

  private:
    std::span<ReaderSlot> slots_;
};

}  // namespace lookhaven::ring
