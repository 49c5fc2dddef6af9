// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/flush_request.h"

#include <algorithm>
#include <array>
#include <stdexcept>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kTableVersion = 0x4c48464c00000001ULL;

enum State : std::uint32_t { kFree = 0, kAsked = 1, kFlushed = 2, kRefused = 3 };

// A slot in one word, so that it changes hands in one step: the event, when it was asked for, the state.
struct Request {
    std::int32_t event;
    std::uint32_t asked_ms;  // of the monotonic clock, its low 30 bits
    State state;

    static Request Of(std::uint64_t word) {
        return {static_cast<std::int32_t>(word >> 32), static_cast<std::uint32_t>(word >> 2) & 0x3fffffff,
                static_cast<State>(word & 3)};
    }
    std::uint64_t Word() const {
        return (std::uint64_t{static_cast<std::uint32_t>(event)} << 32) | (std::uint64_t{asked_ms} << 2) | state;
    }
    bool IsStale(std::uint32_t now_ms) const { return ((now_ms - asked_ms) & 0x3fffffff) > FlushRequests::kStaleMs; }
};

std::uint32_t NowMs() {
    return static_cast<std::uint32_t>(base::MonotonicMicros() / 1000) & 0x3fffffff;
}

}  // namespace

struct FlushRequests::Table {
    std::atomic<std::uint64_t> version;
    std::atomic<std::uint32_t> answers;  // futex word, changes with every answer
    std::array<std::atomic<std::uint64_t>, kSlots> slots;

    // Null when all slots are younger requests.
    std::atomic<std::uint64_t>* Take(const Request& request) {
        for (std::atomic<std::uint64_t>& slot : slots) {
            std::uint64_t held = slot.load();
            const Request before = Request::Of(held);
            if ((before.state == kFree || before.IsStale(request.asked_ms)) &&
                slot.compare_exchange_strong(held, request.Word())) {
                return &slot;
            }
        }
        return nullptr;
    }
};

FlushRequests::FlushRequests(const base::Installation& installation)
    : mapping_(installation.RunFolder() / "flush-requests", sizeof(Table)),
      recorder_(installation),
      config_(MapCommonConfig(installation)) {
    std::uint64_t version = 0;
    if (!Shared().version.compare_exchange_strong(version, kTableVersion) && version != kTableVersion) {
        throw std::runtime_error((installation.RunFolder() / "flush-requests").string() +
                                 " was made by another version: stop everything and remove it");
    }
}

FlushRequests::Table& FlushRequests::Shared() const {
    return *static_cast<Table*>(mapping_.Data());
}

bool FlushRequests::Ask(std::int32_t event, std::chrono::milliseconds limit) {
    if (config_ == nullptr || !IsRecorderAlive(*config_)) {
        return false;
    }
    Table& table = Shared();
    const Request request{event, NowMs(), kAsked};
    std::atomic<std::uint64_t>* slot = table.Take(request);
    if (slot == nullptr) {
        return false;
    }
    recorder_.Wake();
    const std::int64_t end_us = base::MonotonicMicros() + std::chrono::microseconds(limit).count();
    std::uint64_t held = request.Word();
    for (std::int64_t left_us = 1; left_us > 0; left_us = end_us - base::MonotonicMicros()) {
        const std::uint32_t answers = table.answers.load();
        held = slot->load();
        if (held != request.Word() || !base::SleepWhile(table.answers, answers, std::chrono::microseconds(left_us))) {
            break;
        }
    }
    held = slot->load();
    const bool is_ours = Request::Of(held).event == event && Request::Of(held).asked_ms == request.asked_ms;
    return is_ours && slot->compare_exchange_strong(held, 0) && Request::Of(held).state == kFlushed;
}

std::vector<std::int32_t> FlushRequests::Pending() const {
    std::vector<std::int32_t> events;
    for (const std::atomic<std::uint64_t>& slot : Shared().slots) {
        const Request request = Request::Of(slot.load());
        if (request.state == kAsked && !request.IsStale(NowMs())) {
            events.push_back(request.event);
        }
    }
    std::ranges::sort(events);
    events.erase(std::unique(events.begin(), events.end()), events.end());
    return events;
}

void FlushRequests::Answer(std::int32_t event, bool flushed) {
    Table& table = Shared();
    for (std::atomic<std::uint64_t>& slot : table.slots) {
        std::uint64_t held = slot.load();
        Request request = Request::Of(held);
        if (request.state == kAsked && request.event == event) {
            request.state = flushed ? kFlushed : kRefused;
            slot.compare_exchange_strong(held, request.Word());
        }
    }
    base::Wake(table.answers);
}

}  // namespace lookhaven::control
