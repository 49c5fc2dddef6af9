// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/pinned_read.h"

#include <mutex>
#include <vector>

namespace lookhaven::ring {

namespace {

// An entry that the writer overwrites before it is pinned is given up for a newer one; a writer that does so this often
// is no camera.
constexpr int kMaxPinTries = 16;

// An entry that this process has pinned without a position.
struct ProcessPin {
    void* ring;
    std::uint32_t generation;
    const Entry* entry;
    int reader;
};

std::mutex process_pins_mutex;
std::vector<ProcessPin> process_pins;

}  // namespace

const Entry* PinnedRead::Pin(std::uint64_t count) {
    const IndexSlot& index = view_.Slot(count);
    if (!IsLive(count)) {
        return nullptr;
    }
    const std::uint64_t region = index.region.load();
    slot_->pin.store(region);
    if (index.count.load() != count) {
        slot_->pin.store(0);
        return nullptr;
    }
    const Entry* entry = view_.EntryAt(Region::FromWord(region));
    if (entry == nullptr) {
        slot_->pin.store(0);
        return nullptr;
    }
    HandOver(entry, count);
    return entry;
}

void PinnedRead::HandOver(const Entry* entry, std::uint64_t count) {
    if (position_ != nullptr) {
        position_->count = count;
        position_->pinned = static_cast<std::int32_t>(count % view_.Constants().index_slots);
        return;
    }
    const std::lock_guard lock(process_pins_mutex);
    process_pins.push_back({ring_, view_.Constants().generation, entry, reader_});
    handed_over_ = true;
}

const Entry* PinnedRead::PinCurrent(const std::atomic<std::uint64_t>& word) {
    std::uint64_t count = word.load();
    for (int tries = 0; tries < kMaxPinTries && count != 0; ++tries) {
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

std::uint64_t PinnedRead::LastCount(int last_sequence) const {
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

void ReleaseProcessPins(void* ring, const Entry* only_entry) {
    const std::lock_guard lock(process_pins_mutex);
    bool is_done = false;
    std::erase_if(process_pins, [&](const ProcessPin& pin) {
        if (is_done || pin.ring != ring || (only_entry != nullptr && pin.entry != only_entry)) {
            return false;
        }
        // The pin may be of another ring, attached earlier at the same address.
        if (pin.generation == View(ring).Constants().generation) {
            ReaderTable(View(ring)).Release(pin.reader);
            is_done = only_entry != nullptr;  // another read of the entry keeps its own pin
        }
        return true;
    });
}

void ForgetProcessPins(const void* ring) {
    const std::lock_guard lock(process_pins_mutex);
    std::erase_if(process_pins, [ring](const ProcessPin& pin) { return pin.ring == ring; });
}

}  // namespace lookhaven::ring
