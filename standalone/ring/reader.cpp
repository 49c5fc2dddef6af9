// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/reader.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <system_error>

#include <sys/mman.h>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/base/log.h"
#include "standalone/ring/pinned_read.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/segment_keys.h"

namespace lookhaven::ring {

namespace {

void Unpin(void* ring, Position& position) {
    if (position.generation == View(ring).Constants().generation) {
        if (ReaderSlot* slot = ReaderTable(View(ring)).Own(position.reader)) {
            slot->pin.store(0);
        }
    }
    position.pinned = -1;
}

std::int64_t Deadline(int wait_millis) {
    return base::MonotonicMicros() + std::clamp(wait_millis, 0, kMaxWaitMillis) * 1000;
}

}  // namespace

void* Attach(const base::Installation& installation, const StreamId& id) try {
    std::optional<FoundSegment> found = FindSegment(installation.Id(), id);
    if (!found) {
        return nullptr;
    }
    if (found->check != SegmentCheck::kGood) {
        // Logged once, since callers that wait for a ring try again and again.
        static std::atomic_flag logged;
        if (logged.test_and_set()) {
            return nullptr;
        }
        base::LogError("the ring of " + NameOf(id) +
                       (found->check == SegmentCheck::kOtherLayout ? " was made by another version of the recorder"
                                                                   : " is damaged") +
                       ": restart the recorder");
        return nullptr;
    }
    void* ring = found->attachment.Release();
    ForgetProcessPins(ring);
    return ring;
} catch (const std::system_error&) {
    return nullptr;  // removed meanwhile
}

void* AttachEmpty(const StreamId& id, const StreamFormat& format) {
    return CreatePrivateSegment(id, format, {.index_slots = 2, .arena_bytes = kBlockBytes}).Release();
}

void Detach(void* ring) {
    if (ring != nullptr) {
        DetachSegment(ring);
    }
}

void StartRead(void* ring, Position* position) {
    if (position != nullptr) {
        const View view(ring);
        *position = Position{};
        position->generation = view.Constants().generation;
        position->reader = ReaderTable(view).Claim();
        // A stream reads the whole ring over and over. Mapping all its pages now is cheaper than a page fault for every
        // few of them later. Kernels without this call take the page faults.
        ::madvise(ring, static_cast<std::size_t>(view.Local().real_bytes), MADV_POPULATE_READ);
    }
}

void StopRead(void* ring, Position* position) {
    if (position == nullptr) {
        ReleaseProcessPins(ring, nullptr);
        return;
    }
    if (position->generation == View(ring).Constants().generation) {
        ReaderTable(View(ring)).Release(position->reader);
    }
    position->reader = -1;
    position->pinned = -1;
}

const Entry* ReadLatest(void* ring) {
    PinnedRead read(ring, nullptr);
    return read ? read.PinCurrent(read.Head().newest) : nullptr;
}

const Entry* ReadLatest(void* ring, int last_sequence, Position* position, int wait_millis) {
    PinnedRead read(ring, position);
    if (!read) {
        return nullptr;
    }
    const SegmentHead& head = read.Head();
    const std::int64_t deadline = Deadline(wait_millis);
    for (;;) {
        const std::uint32_t wake = head.wake.load();
        if (head.newest.load() != read.LastCount(last_sequence)) {
            if (const Entry* entry = read.PinCurrent(head.newest)) {
                return entry;
            }
        }
        const std::int64_t left = deadline - base::MonotonicMicros();
        if (left <= 0 || head.retired.load() != 0 ||
            !base::SleepWhile(head.wake, wake, std::chrono::microseconds(left))) {
            return nullptr;
        }
    }
}

const Entry* ReadNext(void* ring, int last_sequence, Position* position) {
    PinnedRead read(ring, position);
    if (!read) {
        return nullptr;
    }
    const SegmentHead& head = read.Head();
    const std::uint64_t last = read.LastCount(last_sequence);
    const std::uint64_t newest = head.newest.load();
    if (last == newest) {
        return nullptr;
    }
    // Never past the newest: a writer may die after it adds an entry to the index, before it raises the newest count.
    if (last < newest && read.IsLive(last)) {
        if (const Entry* entry = read.Pin(last + 1)) {
            return entry;
        }
    }
    return read.PinCurrent(head.newest_key);  // of an audio ring the newest entry
}

bool HasUnread(const void* ring, const Position& position) {
    const SegmentHead& head = View(ring).Head();
    return head.newest.load() != position.count && head.newest_key.load() != 0;
}

const Entry* ReadNext(void* ring, int last_sequence, Position* position, const SecondReader& other, int wait_millis) {
    const SegmentHead& head = View(ring).Head();
    const SegmentHead& other_head = other.ring == nullptr ? head : View(other.ring).Head();
    const std::int64_t deadline = Deadline(wait_millis);
    for (;;) {
        const base::SeenWord wake{head.wake, head.wake.load()};
        const base::SeenWord other_wake{other_head.wake, other_head.wake.load()};
        if (const Entry* entry = ReadNext(ring, last_sequence, position)) {
            return entry;
        }
        const std::chrono::microseconds left(deadline - base::MonotonicMicros());
        if ((other.ring != nullptr && HasUnread(other.ring, *other.position)) || left.count() <= 0 ||
            head.retired.load() != 0 || other_head.retired.load() != 0) {
            return nullptr;
        }
        const bool is_undisturbed = other.ring == nullptr ? base::SleepWhile(head.wake, wake.seen, left)
                                                          : base::SleepWhileBoth(wake, other_wake, left);
        if (!is_undisturbed) {
            return nullptr;
        }
    }
}

const Entry* ReadLatestIFrame(void* ring) {
    PinnedRead read(ring, nullptr);
    return read ? read.PinCurrent(read.Head().newest_key) : nullptr;
}

void ReadFinish(void* ring, const Entry* entry, Position* position) {
    if (position != nullptr) {
        Unpin(ring, *position);
    } else if (entry != nullptr) {
        ReleaseProcessPins(ring, entry);
    }
}

void ReadIFrameFinish(void* ring, const Entry* entry, Position* position) {
    ReadFinish(ring, entry, position);
}

bool IsRetired(const void* ring) {
    return View(ring).Head().retired.load() != 0;
}

bool IsWriterAlive(const void* ring) {
    return IsWordAlive(View(ring).Head().writer.load());
}

bool HasFrameOfThisStart(const void* ring) {
    const View view(ring);
    const std::uint64_t writer = view.Head().writer.load();
    // In this order: while the index is this writer's, it wrote what the index names.
    if (!IsWordAlive(writer) || view.Head().index_of.load() != writer) {
        return false;
    }
    const std::uint64_t newest = view.Head().newest.load();
    return newest != 0 && view.Slot(newest).count.load() == newest;
}

std::int64_t HeartbeatAgeMicros(const void* ring) {
    return base::MonotonicMicros() - View(ring).Head().heartbeat_micros.load();
}

const char* Codec(const void* ring) {
    return View(ring).Constants().codec;
}

std::span<const unsigned char> ExtraData(const void* ring) {
    const SegmentConstants& constants = View(ring).Constants();
    return {constants.extra_data, constants.extra_length};
}

std::int32_t Width(const void* ring) {
    return View(ring).Constants().width;
}

std::int32_t Height(const void* ring) {
    return View(ring).Constants().height;
}

Medium MediumOf(const void* ring) {
    return View(ring).Id().medium;
}

}  // namespace lookhaven::ring
