// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/slow_viewer.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <utility>

#include <time.h>

#include "standalone/base/clock.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/send_queue.h"

namespace lookhaven::binding {

namespace {

// A muxed stream needs each frame, so it falls behind on a slow connection; from here on it skips to a key frame.
constexpr std::int64_t kMaxBehindMs = 2'000;
// Shorter than the time-out of twenty seconds without a write, which would end the stream.
constexpr std::int64_t kMaxSoundPauseUs = 10'000'000;

bool IsDrained() {
    SendQueue* queue = RequestContext::Current().Queue();
    return queue == nullptr || queue->IsDrained();
}

bool TakeOverduePicture() {
    SendQueue* queue = RequestContext::Current().Queue();
    return queue != nullptr && queue->TakeOverduePicture();
}

// Waits until what was sent before has left, or a picture is overdue. Returns the milliseconds that are left of a
// ring's longest wait; nothing when neither happened in time, or a signal came.
std::optional<int> AwaitDrained() {
    constexpr timespec kPoll{0, 3'000'000};
    const std::int64_t until_us = base::MonotonicMicros() + ring::kMaxWaitMillis * 1000;
    while (!IsDrained() && !TakeOverduePicture()) {
        if (base::MonotonicMicros() > until_us || ::nanosleep(&kPoll, nullptr) != 0) {
            return std::nullopt;
        }
    }
    return static_cast<int>((until_us - base::MonotonicMicros()) / 1000);
}

std::int64_t AgeMs(const ring::Entry& entry) {
    return base::WallMillis() - entry.CaptureMillis();
}

bool IsBehind(const ring::Entry& entry) {
    return AgeMs(entry) > kMaxBehindMs;
}

// How far the muxed stream of this process lags.
struct Lag {
    std::int64_t max_behind_ms = 0;  // 0: the stream has not begun
    bool is_held_back = false;       // a slow connection kept it from the newest frame
    bool is_skipping = false;
    bool is_sound_held_back = false;
    std::int64_t sound_us = 0;  // monotonic, when sound was last given out
} g_lag;

// The group that a stream begins with is sent even if that is old, and may become no older.
void BeginLag(void* stream) {
    const ring::Entry* key = ring::ReadLatestIFrame(stream);
    g_lag.max_behind_ms = std::max(kMaxBehindMs, key == nullptr ? 0 : AgeMs(*key));
    ring::ReadIFrameFinish(stream, key, nullptr);
}

// Whether the entry is left out: a stream that a slow connection has made late continues at the first key frame that
// is not late.
bool IsSkipped(const ring::Entry& entry) {
    const bool is_key = (entry.flags & ring::kKeyFrame) != 0;
    if (is_key || !IsBehind(entry)) {
        g_lag.max_behind_ms = kMaxBehindMs;
    }
    const bool is_behind = AgeMs(entry) > g_lag.max_behind_ms;
    g_lag.is_held_back = g_lag.is_held_back && is_behind;
    g_lag.is_skipping = (g_lag.is_skipping && !(is_key && !is_behind)) || g_lag.is_held_back;
    return g_lag.is_skipping;
}

// After ten seconds without a frame all older ones are skipped, so only a fresh key frame can be sent then.
bool HasFreshKeyFrame(void* stream) {
    const ring::Entry* entry = ring::ReadLatestIFrame(stream);
    const bool is_fresh = entry != nullptr && !IsBehind(*entry);
    ring::ReadIFrameFinish(stream, entry, nullptr);
    return is_fresh;
}

}  // namespace

const ring::Entry* ReadLatestPicture(void* stream, int last_sequence, ring::Position* position) {
    const std::optional<int> left_millis = AwaitDrained();
    return left_millis ? ring::ReadLatest(stream, last_sequence, position, *left_millis) : nullptr;
}

const ring::Entry* ReadNextSound(void* stream, int last_sequence, ring::Position* position) {
    if (position != nullptr && !ring::HasUnread(stream, *position)) {
        return nullptr;
    }
    if (!IsDrained() && base::MonotonicMicros() - g_lag.sound_us < kMaxSoundPauseUs) {
        g_lag.is_sound_held_back = true;
        return nullptr;
    }
    const ring::Entry* entry = ring::ReadNext(stream, last_sequence, position);
    if (entry != nullptr) {
        g_lag.sound_us = base::MonotonicMicros();
    }
    if (entry == nullptr || !std::exchange(g_lag.is_sound_held_back, false) || !IsBehind(*entry)) {
        return entry;
    }
    last_sequence = entry->sequence;
    ring::ReadFinish(stream, entry, position);
    return ring::ReadLatest(stream, last_sequence, position, 0);
}

const ring::Entry* ReadNextPicture(void* stream, int last_sequence, ring::Position* position,
                                   const ring::SecondReader* sound) {
    if (g_lag.max_behind_ms == 0) {
        BeginLag(stream);
    }
    if (!IsDrained() && !(HasFreshKeyFrame(stream) && TakeOverduePicture())) {
        g_lag.is_held_back = true;
        return nullptr;
    }
    const ring::Entry* entry = sound != nullptr ? ring::ReadNext(stream, last_sequence, position, *sound)
                                                : ring::ReadNext(stream, last_sequence, position);
    while (entry != nullptr && IsSkipped(*entry)) {
        last_sequence = entry->sequence;
        ring::ReadFinish(stream, entry, position);
        entry = ring::ReadNext(stream, last_sequence, position);
    }
    return entry;
}

}  // namespace lookhaven::binding
