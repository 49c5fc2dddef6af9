// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/reader.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <system_error>

#include <sys/mman.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/base/log.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/reading.h"

namespace lookhaven::ring {

namespace {

void Unpin(void* ring, Position& position) {
    if (position.generation == View(ring).Head().generation) {
        if (ReaderSlot* slot = ReaderTable(View(ring)).Own(position.reader)) {
            slot->pin.store(0);
        }
    }
    position.pinned = -1;
}

}  // namespace

void* Attach(const base::Installation& installation, const StreamId& id) try {
    std::optional<FoundSegment> found = FindSegment(installation.Id(), id);
    if (!found) {
        return nullptr;
    }
    if (found->check != SegmentCheck::kGood) {
        // Said once, for whoever waits for a ring asks again and again.
        static std::atomic_flag said;
        if (said.test_and_set()) {
            return nullptr;
        }
        base::LogError("the ring of camera " + std::to_string(id.camera) + " stream " + std::to_string(id.stream) +
                       (found->check == SegmentCheck::kOtherLayout ? " was made by another version of the recorder"
                                                                   : " is damaged") +
                       ": restart the recorder");
        return nullptr;
    }
    void* ring = found->attachment.Release();
    ForgetLoosePins(ring);
    return ring;
} catch (const std::system_error&) {
    return nullptr;  // removed between finding and looking
}

void* AttachEmpty(const StreamId& id, const StreamFormat& format) {
    return CreatePrivateSegment(id, format, {.index_slots = 2, .arena_bytes = kBlockBytes}).Release();
}

void Detach(void* ring) {
    if (ring != nullptr) {
        ::shmdt(ring);
    }
}

void StartRead(void* ring, Position* position) {
    if (position != nullptr) {
        const View view(ring);
        *position = Position{};
        position->generation = view.Head().generation;
        position->reader = ReaderTable(view).Claim();
        // A stream comes through the whole ring again and again. Mapping it now, at one go, is cheaper than a page fault
        // for every few pages of its first round. Kernels that know no such call fault as before.
        ::madvise(ring, view.Head().segment_bytes, MADV_POPULATE_READ);
    }
}

void StopRead(void* ring, Position* position) {
    if (position == nullptr) {
        ReleaseLoosePins(ring, nullptr);
        return;
    }
    if (position->generation == View(ring).Head().generation) {
        ReaderTable(View(ring)).Release(position->reader);
    }
    position->reader = -1;
    position->pinned = -1;
}

const Entry* ReadLatest(void* ring) {
    Reading reading(ring, nullptr);
    return reading ? reading.PinNamedBy(reading.Head().newest) : nullptr;
}

const Entry* ReadLatest(void* ring, int last_sequence, Position* position, int wait_millis) {
    Reading reading(ring, position);
    if (!reading) {
        return nullptr;
    }
    const SegmentHead& head = reading.Head();
    const std::int64_t deadline = base::MonotonicMicros() + std::clamp(wait_millis, 0, kMaxWaitMillis) * 1000;
    for (;;) {
        const std::uint32_t wake = head.wake.load();
        if (head.newest.load() != reading.LastCount(last_sequence)) {
            if (const Entry* entry = reading.PinNamedBy(head.newest)) {
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
    Reading reading(ring, position);
    if (!reading) {
        return nullptr;
    }
    const SegmentHead& head = reading.Head();
    const std::uint64_t last = reading.LastCount(last_sequence);
    const std::uint64_t newest = head.newest.load();
    if (last == newest) {
        return nullptr;
    }
    // Never past the newest: the entry behind it may be named already by a writer that dies before it counts.
    if (last < newest && reading.IsLive(last)) {
        if (const Entry* entry = reading.Pin(last + 1)) {
            return entry;
        }
    }
    return reading.PinNamedBy(head.newest_key);  // of an audio ring the newest entry
}

const Entry* ReadLatestIFrame(void* ring) {
    Reading reading(ring, nullptr);
    return reading ? reading.PinNamedBy(reading.Head().newest_key) : nullptr;
}

void ReadFinish(void* ring, const Entry* entry, Position* position) {
    if (position != nullptr) {
        Unpin(ring, *position);
    } else if (entry != nullptr) {
        ReleaseLoosePins(ring, entry);
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
    // Asked in this order: while the index is this writer's, what it names was written by it.
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
    return View(ring).Head().codec;
}

std::span<const unsigned char> ExtraData(const void* ring) {
    const SegmentHead& head = View(ring).Head();
    return {head.extra_data, head.extra_length};
}

std::int32_t Width(const void* ring) {
    return View(ring).Head().width;
}

std::int32_t Height(const void* ring) {
    return View(ring).Head().height;
}

Medium MediumOf(const void* ring) {
    return View(ring).Id().medium;
}

}  // namespace lookhaven::ring
