// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/reading.h"

#include <mutex>
#include <vector>

namespace lookhaven::ring {

namespace {

// Entries overtaken by the writer between the look at the newest count and the pin are tried again; a writer that
// overtakes a reader that often is not a camera.
constexpr int kPinTries = 16;

// What this process has pinned without a position.
struct LoosePin {
    void* ring;
    std::uint32_t generation;
    const Entry* entry;
    int reader;
};

std::mutex loose_pins_mutex;
std::vector<LoosePin> loose_pins;

}  // namespace

const Entry* Reading::Pin(std::uint64_t count) {
    const IndexSlot& index = view_.Slot(count);
    if (!IsLive(count)) {
        return nullptr;
    }
    const std::uint64_t place = index.place.load();
    slot_->pin.store(place);
    if (index.count.load() != count) {
        slot_->pin.store(0);
        return nullptr;
    }
    const Entry* entry = view_.EntryAt(Place::FromWord(place));
    if (entry == nullptr) {
        slot_->pin.store(0);
        return nullptr;
    }
    Keep(entry, count);
    return entry;
}

void Reading::Keep(const Entry* entry, std::uint64_t count) {
    if (position_ != nullptr) {
        position_->count = count;
        position_->pinned = static_cast<std::int32_t>(count % Head().index_slots);
        return;
    }
    const std::lock_guard lock(loose_pins_mutex);
    loose_pins.push_back({ring_, Head().generation, entry, reader_});
    kept_ = true;
}

const Entry* Reading::PinNamedBy(const std::atomic<std::uint64_t>& word) {
    std::uint64_t count = word.load();
    for (int tries = 0; tries < kPinTries && count != 0; ++tries) {
        if (const Entry* entry = Pin(count)) {
            return entry;
        }
        const std::uint64_t now = word.load();
        if (now == count) {
            return nullptr;
        }
        count = now;
    }
    return nullptr;
}

std::uint64_t Reading::LastCount(int last_sequence) const {
    if (last_sequence < 0 || last_sequence > kLastSequence) {
        return 0;
    }
    if (position_ != nullptr && position_->count != 0 && SequenceOf(position_->count) == last_sequence) {
        return position_->count;
    }
    // The ring holds fewer entries than there are numbers, so at most one entry can have this number.
    const std::uint64_t newest = Head().newest.load();
    if (newest == 0) {
        return 0;
    }
    constexpr std::uint64_t kNumbers = kLastSequence + 1;
    const auto back =
        (static_cast<std::uint64_t>(SequenceOf(newest)) + kNumbers - static_cast<std::uint64_t>(last_sequence)) %
        kNumbers;
    return back < newest ? newest - back : 0;
}

void ReleaseLoosePins(void* ring, const Entry* only_entry) {
    const std::lock_guard lock(loose_pins_mutex);
    std::erase_if(loose_pins, [&](const LoosePin& pin) {
        if (pin.ring != ring || (only_entry != nullptr && pin.entry != only_entry)) {
            return false;
        }
        // A ring attached later at the same address has nothing to do with the pin.
        if (pin.generation == View(ring).Head().generation) {
            ReaderTable(View(ring)).Release(pin.reader);
        }
        return true;
    });
}

void ForgetLoosePins(const void* ring) {
    const std::lock_guard lock(loose_pins_mutex);
    std::erase_if(loose_pins, [ring](const LoosePin& pin) { return pin.ring == ring; });
}

}  // namespace lookhaven::ring
