// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/demand.h"

#include <algorithm>
#include <array>
#include <atomic>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kTableVersion = 0x4c48444d00000001ULL;
// A stream that was last requested longer ago is new to the recorder, which may have stopped it.
constexpr std::int64_t kRepeatMicros = 2'000'000;
constexpr std::int64_t kSlotReuseMicros = 60'000'000;
// Viewers go on while the recorder looks, so a request may be later than the time that the look began.
constexpr std::int64_t kMaxAheadMicros = 1'000'000;

struct Slot {
    std::atomic<std::uint64_t> key;  // 0 while never used
    std::atomic<std::int64_t> requested_micros;
};

std::uint64_t KeyOf(LiveStream stream) {
    constexpr std::uint64_t kUsed = std::uint64_t{1} << 63;
    return kUsed | (std::uint64_t{static_cast<std::uint32_t>(stream.camera)} << 31) |
           (static_cast<std::uint32_t>(stream.stream) & 0x7fffffff);
}

LiveStream StreamOf(std::uint64_t key) {
    return {static_cast<std::int32_t>((key >> 31) & 0xffffffff), static_cast<std::int32_t>(key & 0x7fffffff)};
}

// Times further ahead are an earlier boot's.
bool IsValid(std::int64_t requested, std::int64_t now, std::int64_t max_age) {
    return requested != 0 && requested - now <= kMaxAheadMicros && now - requested <= max_age;
}

}  // namespace

struct Demand::Table {
    std::atomic<std::uint64_t> version;
    std::atomic<std::uint32_t> requests;  // futex word, changes when a stream is newly requested
    std::array<Slot, kSlots> slots;

    Slot* SlotFor(std::uint64_t key, std::int64_t now);
};

// The stream's slot, else one that it takes over; null when the table is full of valid requests. Two processes at the
// same time may leave the stream in two slots, which does no harm.
Slot* Demand::Table::SlotFor(std::uint64_t key, std::int64_t now) {
    const auto home = static_cast<std::size_t>((key * 0x9e3779b97f4a7c15ULL) >> 54);
    Slot* reusable = nullptr;
    std::uint64_t reusable_key = 0;
    for (std::size_t i = 0; i < kSlots; ++i) {
        Slot& slot = slots[(home + i) % kSlots];
        const std::uint64_t held = slot.key.load();
        if (held == key) {
            return &slot;
        }
        if (reusable == nullptr && (held == 0 || !IsValid(slot.requested_micros.load(), now, kSlotReuseMicros))) {
            reusable = &slot;
            reusable_key = held;
        }
        if (held == 0) {
            break;
        }
    }
    if (reusable != nullptr && reusable->key.compare_exchange_strong(reusable_key, key)) {
        reusable->requested_micros.store(0);
        return reusable;
    }
    return reusable_key == key ? reusable : nullptr;
}

Demand::Demand(const base::Installation& installation)
    : table_(MappedTable<Table>::OpenOrCreate(installation.RunFolder() / "live-demand", kTableVersion)),
      seen_(table_->requests.load()) {}

void Demand::Request(LiveStream stream) {
    const std::int64_t now = base::MonotonicMicros();
    Slot* slot = table_->SlotFor(KeyOf(stream), now);
    if (slot == nullptr) {
        return;
    }
    const std::int64_t before = slot->requested_micros.exchange(now);
    if (!IsValid(before, now, kRepeatMicros)) {
        base::Wake(table_->requests);
    }
}

std::vector<LiveStream> Demand::ActiveStreams(std::int64_t now_micros, std::chrono::microseconds max_age) const {
    std::vector<LiveStream> streams;
    for (const Slot& slot : table_->slots) {
        const std::uint64_t key = slot.key.load();
        if (key != 0 && IsValid(slot.requested_micros.load(), now_micros, max_age.count())) {
            streams.push_back(StreamOf(key));
        }
    }
    std::ranges::sort(streams);
    streams.erase(std::unique(streams.begin(), streams.end()), streams.end());
    return streams;
}

void Demand::Wake() {
    base::Wake(table_->requests);
}

void Demand::WaitForDemand(std::chrono::milliseconds timeout) {
    const std::atomic<std::uint32_t>& requests = table_->requests;
    if (requests.load() == seen_) {
        base::SleepWhile(requests, seen_, timeout);
    }
    seen_ = requests.load();
}

}  // namespace lookhaven::control
