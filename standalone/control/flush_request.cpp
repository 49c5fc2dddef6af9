// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/flush_request.h"

#include <algorithm>
#include <array>
#include <atomic>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kTableVersion = 0x4c48464c00000001ULL;

enum State : std::uint32_t { kFree = 0, kRequested = 1, kFlushed = 2, kRefused = 3 };

// A slot in one word, so that it changes hands in one step: the event, when it was requested, the state.
struct Request {
    std::int32_t event;
    std::uint32_t requested_ms;  // of the monotonic clock, its low 30 bits
    State state;

    static Request Of(std::uint64_t word) {
        return {static_cast<std::int32_t>(word >> 32), static_cast<std::uint32_t>(word >> 2) & 0x3fffffff,
                static_cast<State>(word & 3)};
    }
    std::uint64_t Word() const {
        return (std::uint64_t{static_cast<std::uint32_t>(event)} << 32) | (std::uint64_t{requested_ms} << 2) | state;
    }
    bool IsStale(std::uint32_t now_ms) const {
        return ((now_ms - requested_ms) & 0x3fffffff) > FlushRequests::kStaleMs;
    }
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
            if ((before.state == kFree || before.IsStale(request.requested_ms)) &&
                slot.compare_exchange_strong(held, request.Word())) {
                return &slot;
            }
        }
        return nullptr;
    }
};

FlushRequests::FlushRequests(const base::Installation& installation)
    : table_(MappedTable<Table>::OpenOrCreate(installation.RunFolder() / "flush-requests", kTableVersion)),
      recorder_(installation),
      config_(MapCommonConfig(installation)) {}

bool FlushRequests::Ask(std::int32_t event, std::chrono::milliseconds limit) {
    if (config_ == nullptr || !IsRecorderAlive(*config_)) {
        return false;
    }
    const Request request{event, NowMs(), kRequested};
    std::atomic<std::uint64_t>* slot = table_->Take(request);
    if (slot == nullptr) {
        return false;
    }
    recorder_.Wake();
    const std::int64_t end_us = base::MonotonicMicros() + std::chrono::microseconds(limit).count();
    std::uint64_t held = request.Word();
    for (std::int64_t left_us = 1; left_us > 0; left_us = end_us - base::MonotonicMicros()) {
        const std::uint32_t answers = table_->answers.load();
        held = slot->load();
        if (held != request.Word() || !base::SleepWhile(table_->answers, answers, std::chrono::microseconds(left_us))) {
            break;
        }
    }
    held = slot->load();
    const bool is_ours = Request::Of(held).event == event && Request::Of(held).requested_ms == request.requested_ms;
    return is_ours && slot->compare_exchange_strong(held, 0) && Request::Of(held).state == kFlushed;
}

std::vector<std::int32_t> FlushRequests::Pending() const {
    std::vector<std::int32_t> events;
    for (const std::atomic<std::uint64_t>& slot : table_->slots) {
        const Request request = Request::Of(slot.load());
        if (request.state == kRequested && !request.IsStale(NowMs())) {
            events.push_back(request.event);
        }
    }
    std::ranges::sort(events);
    events.erase(std::unique(events.begin(), events.end()), events.end());
    return events;
}

void FlushRequests::Answer(std::int32_t event, bool flushed) {
    for (std::atomic<std::uint64_t>& slot : table_->slots) {
        std::uint64_t held = slot.load();
        Request request = Request::Of(held);
        if (request.state == kRequested && request.event == event) {
            request.state = flushed ? kFlushed : kRefused;
            slot.compare_exchange_strong(held, request.Word());
        }
    }
    base::Wake(table_->answers);
}

}  // namespace lookhaven::control
