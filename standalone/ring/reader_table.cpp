// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/reader_table.h"

#include <algorithm>

#include "standalone/ring/process_word.h"

namespace lookhaven::ring {

namespace {

// Makes the slot this process's if its owner is the one given. The exchange decides between several that try; only the
// winner may change the pin.
bool TakeFrom(ReaderSlot& slot, std::uint64_t owner) {
    if (!slot.owner.compare_exchange_strong(owner, OwnWord())) {
        return false;
    }
    slot.pin.store(0);
    return true;
}

}  // namespace

int ReaderTable::Claim() {
    for (std::size_t i = 0; i < slots_.size(); ++i) {
        if (slots_[i].owner.load() == 0 && TakeFrom(slots_[i], 0)) {
            return static_cast<int>(i);
        }
    }
    for (std::size_t i = 0; i < slots_.size(); ++i) {
        const std::uint64_t owner = slots_[i].owner.load();
        if (!IsWordAlive(owner) && TakeFrom(slots_[i], owner)) {
            return static_cast<int>(i);
        }
    }
    return -1;
}

void ReaderTable::Release(int reader) {
    if (ReaderSlot* slot = Own(reader)) {
        slot->pin.store(0);
        slot->owner.store(0);
    }
}

ReaderSlot* ReaderTable::Own(int reader) const {
    if (reader < 0 || static_cast<std::size_t>(reader) >= slots_.size()) {
        return nullptr;
    }
    ReaderSlot& slot = slots_[static_cast<std::size_t>(reader)];
    return slot.owner.load() == OwnWord() ? &slot : nullptr;
}

std::uint64_t ReaderTable::PinnedUntil(const Region& region) const {
    std::uint64_t end = 0;
    for (ReaderSlot& slot : slots_) {
        const Region pin = Region::FromWord(slot.pin.load());
        if (pin.blocks == 0 || !pin.Overlaps(region)) {
            continue;
        }
        const std::uint64_t owner = slot.owner.load();
        if (owner != 0 && !IsWordAlive(owner) && TakeFrom(slot, owner)) {
            slot.owner.store(0);
            continue;
        }
        end = std::max(end, pin.End());
    }
    return end;
}

std::uint32_t ReaderTable::Used() const {
    return static_cast<std::uint32_t>(
        std::ranges::count_if(slots_, [](const ReaderSlot& slot) { return slot.owner.load() != 0; }));
}

}  // namespace lookhaven::ring
