// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/demand.h"

#include <algorithm>
#include <array>
#include <stdexcept>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kTableVersion = 0x4c48444d00000001ULL;
// A stream stamped longer ago than this is news to the recorder, which may have stopped it.
constexpr std::int64_t kFreshMicros = 2'000'000;
constexpr std::int64_t kReusableMicros = 60'000'000;
// Viewers stamp while the recorder looks, so a stamp may be later than the time that the look began.
constexpr std::int64_t kAheadMicros = 1'000'000;

struct Slot {
    std::atomic<std::uint64_t> key;  // 0 while never used
    std::atomic<std::int64_t> touched_micros;
};

std::uint64_t KeyOf(LiveStream stream) {
    constexpr std::uint64_t kUsed = std::uint64_t{1} << 63;
    return kUsed | (std::uint64_t{static_cast<std::uint32_t>(stream.camera)} << 31) |
           (static_cast<std::uint32_t>(stream.stream) & 0x7fffffff);
}

LiveStream StreamOf(std::uint64_t key) {
    return {static_cast<std::int32_t>((key >> 31) & 0xffffffff), static_cast<std::int32_t>(key & 0x7fffffff)};
}

// Stamps further ahead are an earlier boot's.
bool IsYounger(std::int64_t touched, std::int64_t now, std::int64_t max_age) {
    return touched != 0 && touched - now <= kAheadMicros && now - touched <= max_age;
}

}  // namespace

struct Demand::Table {
    std::atomic<std::uint64_t> version;
    std::atomic<std::uint32_t> wishes;  // futex word, changes when a stream is newly wanted
    std::array<Slot, kSlots> slots;

    Slot* SlotFor(std::uint64_t key, std::int64_t now);
};

// The stream's slot, else one that it takes over; null when the table is full of younger wishes. Two processes that
// come at once may leave the stream in two slots, which does no harm.
Slot* Demand::Table::SlotFor(std::uint64_t key, std::int64_t now) {
    const std::size_t home = (key * 0x9e3779b97f4a7c15ULL) >> 54;
    Slot* reusable = nullptr;
    std::uint64_t reusable_key = 0;
    for (std::size_t i = 0; i < kSlots; ++i) {
        Slot& slot = slots[(home + i) % kSlots];
        const std::uint64_t held = slot.key.load();
        if (held == key) {
            return &slot;
        }
        if (reusable == nullptr && (held == 0 || !IsYounger(slot.touched_micros.load(), now, kReusableMicros))) {
            reusable = &slot;
            reusable_key = held;
        }
        if (held == 0) {
            break;
        }
    }
    if (reusable != nullptr && reusable->key.compare_exchange_strong(reusable_key, key)) {
        reusable->touched_micros.store(0);
        return reusable;
    }
    return reusable_key == key ? reusable : nullptr;
}

Demand::Demand(const base::Installation& installation)
    : mapping_(installation.RunFolder() / "live-demand", sizeof(Table)) {
    std::uint64_t version = 0;
    if (!Shared().version.compare_exchange_strong(version, kTableVersion) && version != kTableVersion) {
        throw std::runtime_error((installation.RunFolder() / "live-demand").string() +
                                 " was made by another version: stop everything and remove it");
    }
    seen_ = Shared().wishes.load();
}

Demand::Table& Demand::Shared() const {
    return *static_cast<Table*>(mapping_.Data());
}

void Demand::Touch(LiveStream stream) {
    Table& table = Shared();
    const std::int64_t now = base::MonotonicMicros();
    Slot* slot = table.SlotFor(KeyOf(stream), now);
    if (slot == nullptr) {
        return;
    }
    const std::int64_t before = slot->touched_micros.exchange(now);
    if (!IsYounger(before, now, kFreshMicros)) {
        base::Wake(table.wishes);
    }
}

std::vector<LiveStream> Demand::ActiveStreams(std::int64_t now_micros, std::chrono::microseconds max_age) const {
    std::vector<LiveStream> streams;
    for (const Slot& slot : Shared().slots) {
        const std::uint64_t key = slot.key.load();
        if (key != 0 && IsYounger(slot.touched_micros.load(), now_micros, max_age.count())) {
            streams.push_back(StreamOf(key));
        }
    }
    std::ranges::sort(streams);
    streams.erase(std::unique(streams.begin(), streams.end()), streams.end());
    return streams;
}

void Demand::Wake() {
    base::Wake(Shared().wishes);
}

void Demand::WaitForDemand(std::chrono::milliseconds timeout) {
    const std::atomic<std::uint32_t>& wishes = Shared().wishes;
    if (wishes.load() == seen_) {
        base::SleepWhile(wishes, seen_, timeout);
    }
    seen_ = wishes.load();
}

}  // namespace lookhaven::control
