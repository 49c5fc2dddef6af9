// SPDX-License-Identifier: Apache-2.0
//
// How one call reads from a ring: it has a place in the reader table, pins an entry there and gives it.
//
// Why so        Some calls come without a position. Each entry that they read takes a place in the table of its own, kept
//               in a list of this process until the entry is given back: a loose pin.
#pragma once

#include <atomic>
#include <cstdint>

#include "standalone/ring/reader.h"
#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment.h"

namespace lookhaven::ring {

// A place in the reader table for one call: the position's, or one of its own that becomes a loose pin.
class Reading {
  public:
    Reading(void* ring, Position* position) : view_(ring), ring_(ring), table_(view_), position_(position) {
        if (position_ == nullptr) {
            reader_ = table_.Claim();
        } else if (position_->generation == view_.Head().generation) {
            reader_ = position_->reader;
        }
        slot_ = table_.Own(reader_);
    }
    ~Reading() {
        if (position_ == nullptr && !kept_) {
            table_.Release(reader_);
        }
    }
    Reading(const Reading&) = delete;
    Reading& operator=(const Reading&) = delete;

    explicit operator bool() const { return slot_ != nullptr; }
    const SegmentHead& Head() const { return view_.Head(); }
    bool IsLive(std::uint64_t count) const { return count != 0 && view_.Slot(count).count.load() == count; }

    // Pins the entry and gives it; null when it is not in the ring any more.
    const Entry* Pin(std::uint64_t count);
    // Pins the entry whose count the word names, following the word when the writer overtakes.
    const Entry* PinNamedBy(const std::atomic<std::uint64_t>& word);

    // The count that the caller read last, as far as it can be told; 0 for none.
    std::uint64_t LastCount(int last_sequence) const;

  private:
    void Keep(const Entry* entry, std::uint64_t count);

    View view_;
    void* ring_;
    ReaderTable table_;
    Position* position_;
    int reader_ = -1;
    ReaderSlot* slot_ = nullptr;
    bool kept_ = false;
};

// Gives back the loose pin of the entry, or with null all that this process has in the ring.
void ReleaseLoosePins(void* ring, const Entry* only_entry);

// Forgets loose pins of an earlier attachment at that address, without touching the ring that is there now.
void ForgetLoosePins(const void* ring);

}  // namespace lookhaven::ring
