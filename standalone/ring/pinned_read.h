// SPDX-License-Identifier: Apache-2.0
//
// One read of a ring: owns a slot of the reader table, pins an entry there and hands it over to the caller.
//
// Why so        Some reads come without a position. Each entry that they return takes a reader slot of its own, which a
//               list of this process keeps until the entry is given back: a process pin.
#pragma once

#include <atomic>
#include <cstdint>

#include "standalone/ring/reader.h"
#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment.h"

namespace lookhaven::ring {

// Uses the position's reader slot, or without a position one claimed for this read, which becomes a process pin or is
// released again by the destructor.
class PinnedRead {
  public:
    PinnedRead(void* ring, Position* position) : view_(ring), ring_(ring), table_(view_), position_(position) {
        if (position_ == nullptr) {
            reader_ = table_.Claim();
        } else if (position_->generation == view_.Constants().generation) {
            reader_ = position_->reader;
        }
        slot_ = table_.Own(reader_);
    }
    ~PinnedRead() {
        if (position_ == nullptr && !handed_over_) {
            table_.Release(reader_);
        }
    }
    PinnedRead(const PinnedRead&) = delete;
    PinnedRead& operator=(const PinnedRead&) = delete;

    // False when there is no slot: nothing may be read then.
    explicit operator bool() const { return slot_ != nullptr; }
    const SegmentHead& Head() const { return view_.Head(); }
    bool IsLive(std::uint64_t count) const { return count != 0 && view_.Slot(count).count.load() == count; }

    // Pins the entry and returns it; null when it is no longer in the ring.
    const Entry* Pin(std::uint64_t count);
    // Pins the entry whose count is in the word, which is read again when the writer has overwritten the entry
    // meanwhile.
    const Entry* PinCurrent(const std::atomic<std::uint64_t>& word);

    // The count of the entry that the caller read last, from the position or else from its number; 0 when unknown.
    std::uint64_t LastCount(int last_sequence) const;

  private:
    void HandOver(const Entry* entry, std::uint64_t count);

    View view_;
    void* ring_;
    ReaderTable table_;
    Position* position_;
    int reader_ = -1;
    ReaderSlot* slot_ = nullptr;
    bool handed_over_ = false;
};

// Releases one process pin of the entry, or with null all that this process has in the ring.
void ReleaseProcessPins(void* ring, const Entry* only_entry);

// Forgets the process pins of an earlier attachment at that address, without touching the ring that is there now.
void ForgetProcessPins(const void* ring);

}  // namespace lookhaven::ring
