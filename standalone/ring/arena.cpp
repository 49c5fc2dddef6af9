// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/arena.h"

#include <algorithm>
#include <cstring>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"

namespace lookhaven::ring {

namespace {

std::uint32_t Low(std::int64_t value) {
    return static_cast<std::uint32_t>(static_cast<std::uint64_t>(value));
}

std::uint32_t High(std::int64_t value) {
    return static_cast<std::uint32_t>(static_cast<std::uint64_t>(value) >> 32);
}

}  // namespace

Arena::Arena(const View& view) : view_(view), readers_(view) {
    // A predecessor may have died after it added an entry to the index, before it raised the newest count.
    newest_ = view_.Head().newest.load();
    for (std::uint32_t i = 0; i < view_.Constants().index_slots; ++i) {
        newest_ = std::max(newest_, view_.Slot(i).count.load());
    }
    StartRun();
}

void Arena::StartRun() {
    SegmentHead& head = view_.Head();
    head.newest_key.store(0);
    for (std::uint32_t i = 0; i < view_.Constants().index_slots; ++i) {
        view_.Slot(i).count.store(0);
    }
    head.newest.store(newest_);
    head.index_of.store(head.writer.load());
    oldest_ = newest_ + 1;
    has_lost_key_frame_ = false;
}

std::uint64_t Arena::OldestStart() const {
    return Region::FromWord(view_.Slot(oldest_).region.load(std::memory_order_relaxed)).first;
}

void Arena::DropOldest() {
    view_.Slot(oldest_).count.store(0);
    if (oldest_ == view_.Head().newest_key.load(std::memory_order_relaxed)) {
        has_lost_key_frame_ = true;
    }
    ++oldest_;
}

// Removes from the index what lies between the cursor and the end of the region: the oldest entries.
void Arena::DropUpTo(const Region& region) {
    std::uint32_t from = cursor_;
    if (region.first < cursor_) {
        while (!IsEmpty() && OldestStart() >= cursor_) {
            DropOldest();
        }
        from = 0;
    }
    while (!IsEmpty() && OldestStart() >= from && OldestStart() < region.End()) {
        DropOldest();
    }
}

std::optional<Region> Arena::ChooseRegion(std::uint32_t blocks) const {
    std::uint64_t first = cursor_;
    for (bool wrapped = false;;) {
        if (first + blocks > view_.Constants().arena_blocks) {
            if (wrapped) {
                return std::nullopt;
            }
            wrapped = true;
            first = 0;
            continue;
        }
        const Region region{static_cast<std::uint32_t>(first), blocks};
        const std::uint64_t pinned_until = readers_.PinnedUntil(region);
        if (pinned_until == 0) {
            return region;
        }
        first = pinned_until;
    }
}

std::optional<Region> Arena::Reserve(std::uint32_t blocks) {
    // A reader may pin an entry after the region was chosen, but none once the entry is dropped: each further try sees
    // at least one more pin, so there are at most as many tries as readers.
    for (std::uint32_t tries = 0; tries <= kReaderSlots; ++tries) {
        const std::optional<Region> region = ChooseRegion(blocks);
        if (!region) {
            return std::nullopt;
        }
        DropUpTo(*region);
        if (readers_.PinnedUntil(*region) == 0) {
            cursor_ = static_cast<std::uint32_t>(region->End());
            return region;
        }
    }
    return std::nullopt;
}

void Arena::Append(const Region& region, const Frame& frame, bool is_key) {
    SegmentHead& head = view_.Head();
    while (!IsEmpty() && newest_ + 1 - oldest_ >= view_.Constants().index_slots) {
        DropOldest();
    }
    const std::uint64_t count = newest_ + 1;
    unsigned char* memory = view_.Memory(region);
    auto& entry = *new (memory) Entry{};
    entry.length = static_cast<std::int32_t>(frame.data.size());
    entry.sequence = SequenceOf(count);
    entry.offset = frame.offset;
    entry.flags = is_key ? kKeyFrame : 0;
    entry.timestamp_low = Low(frame.timestamp_micros);
    entry.timestamp_high = High(frame.timestamp_micros);
    entry.capture_low = Low(frame.capture_millis);
    entry.capture_high = High(frame.capture_millis);
    entry.count_low = Low(static_cast<std::int64_t>(count));
    entry.count_high = High(static_cast<std::int64_t>(count));
    std::memcpy(memory + sizeof(Entry), frame.data.data(), frame.data.size());

    IndexSlot& slot = view_.Slot(count);
    slot.region.store(region.Word());
    slot.count.store(count);
    newest_ = count;
    // Readers read no further than the newest count, so it is raised before newest_key names the entry.
    head.newest.store(count);
    if (is_key) {
        head.newest_key.store(count);
        has_lost_key_frame_ = false;
    }
    head.heartbeat_micros.store(base::MonotonicMicros());
    base::Wake(head.wake);
}

}  // namespace lookhaven::ring
