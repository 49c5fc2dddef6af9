// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/segment_keys.h"

#include <algorithm>
#include <cerrno>
#include <new>
#include <span>
#include <string>
#include <system_error>
#include <utility>

#include <sys/ipc.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/ring/process_word.h"

namespace lookhaven::ring {

namespace {

constexpr std::uint32_t kKeyPrefix = 0x4c;  // the highest byte
constexpr std::uint32_t kKeysPerStream = 1U << 16;

// The keys of one stream: their upper half, and the lower half of the first.
struct StreamKeys {
    std::uint32_t upper;
    std::uint32_t first;

    StreamKeys(std::uint64_t installation, const StreamId& id) {
        std::uint64_t hash = installation;
        for (const std::int32_t part : {id.camera, id.stream, static_cast<std::int32_t>(id.medium)}) {
            hash = (hash ^ static_cast<std::uint32_t>(part)) * 0x9e3779b97f4a7c15ULL;
            hash ^= hash >> 32;
        }
        upper = (kKeyPrefix << 8) | (static_cast<std::uint32_t>(hash >> 16) & 0xff);
        first = static_cast<std::uint32_t>(hash) & 0xffff;
    }

    key_t At(std::uint32_t i) const { return static_cast<key_t>((upper << 16) | ((first + i) & 0xffff)); }
    bool Has(key_t key) const { return static_cast<std::uint32_t>(key) >> 16 == upper; }
};

void ReportTakenKey(key_t key, int shm_id, const StreamId& id) {
    base::LogError("another user or program holds shared memory " + std::to_string(shm_id) + " under the key " +
                   std::to_string(key) + " of the ring of " + NameOf(id) + ", which takes its next key; ipcs -m -i " +
                   std::to_string(shm_id) + " says whose it is");
}

void FillHead(SegmentHead& head, std::uint64_t installation, const StreamId& id, const StreamFormat& format,
              const Geometry& geometry) {
    SegmentConstants& constants = head.constants;
    constants.installation = installation;
    std::atomic_signal_fence(std::memory_order_seq_cst);  // from here on a dead writer leaves a head that names it
    constants.layout_version = kLayoutVersion;
    constants.generation = static_cast<std::uint32_t>(base::MonotonicMicros());
    constants.segment_bytes = SegmentBytes(geometry);
    constants.camera = id.camera;
    constants.stream = id.stream;
    constants.medium = static_cast<std::int32_t>(id.medium);
    constants.reader_slots = kReaderSlots;
    constants.index_slots = geometry.index_slots;
    constants.arena_blocks = static_cast<std::uint32_t>(geometry.arena_bytes / kBlockBytes);
    constants.width = format.width;
    constants.height = format.height;
    constants.every_frame_is_key = format.every_frame_is_key ? 1 : 0;
    const StreamFormat stored = Storable(format);
    stored.codec.copy(constants.codec, kMaxCodecLength);
    constants.extra_length = static_cast<std::uint32_t>(stored.extra_data.size());
    std::ranges::copy(stored.extra_data, constants.extra_data);
    head.heartbeat_micros.store(base::MonotonicMicros());
    head.writer.store(OwnWord());
}

// Attaches a segment just made, which goes again when it cannot be attached.
Attachment AttachNew(int shm_id) {
    try {
        return Attachment(shm_id);
    } catch (...) {
        ::shmctl(shm_id, IPC_RMID, nullptr);
        throw;
    }
}

// A segment of zeros under the first of the stream's keys that is free.
Attachment MakeUnderKey(std::uint64_t installation, const StreamId& id, const Geometry& geometry) {
    const StreamKeys keys(installation, id);
    bool reported = false;
    for (std::uint32_t i = 0; i < kKeysPerStream; ++i) {
        const key_t key = keys.At(i);
        const int holder = ::shmget(key, 0, 0);
        shmid_ds status{};
        const bool is_own = holder >= 0 && ::shmctl(holder, IPC_STAT, &status) == 0 && IsOwn(status);
        if (is_own) {
            RemoveIfAbandoned(installation, holder);
        }
        const auto bytes = static_cast<std::size_t>(SegmentBytes(geometry));
        const int shm_id = ::shmget(key, bytes, IPC_CREAT | IPC_EXCL | kSegmentMode);
        if (shm_id >= 0) {
            return AttachNew(shm_id);
        }
        if (errno != EEXIST) {
            break;
        }
        // One that has gone meanwhile has kept nothing from us.
        if (holder >= 0 && !is_own && !std::exchange(reported, true)) {
            ReportTakenKey(key, holder, id);
        }
    }
    base::ThrowErrno("cannot make a ring of " + std::to_string(SegmentBytes(geometry)) + " bytes of shared memory");
}

// Fresh shared memory is zeros, which is what every slot begins with.
Attachment Finish(Attachment attachment, std::uint64_t installation, const StreamId& id, const StreamFormat& format,
                  const Geometry& geometry) {
    auto& head = *new (attachment.Address()) SegmentHead{};
    FillHead(head, installation, id, format, geometry);
    head.magic.store(kMagic);
    attachment.CopyConstants();
    return attachment;
}

// Other programs of this user may have segments under keys like ours. One of ours is all zeros or says whose it is.
bool MayBeOurs(const SegmentHead& head, std::uint64_t installation) {
    const std::span bytes(reinterpret_cast<const unsigned char*>(&head), sizeof head);
    return head.constants.installation == installation ||
           std::ranges::all_of(bytes, [](unsigned char byte) { return byte == 0; });
}

// The segment, if it is the stream's; nothing, too, when it vanishes meanwhile.
std::optional<FoundSegment> OpenIfStreams(int shm_id, std::uint64_t installation, const StreamId& id) {
    try {
        Attachment attachment(shm_id);
        const SegmentCheck check = CheckSegment(attachment.Address());
        if (check == SegmentCheck::kNotARing || check == SegmentCheck::kUnfinished) {
            return std::nullopt;
        }
        const View view(attachment.Address());
        const bool is_current = check == SegmentCheck::kOtherLayout || view.Head().retired.load() == 0;
        if (view.Constants().installation == installation && view.Id() == id && is_current) {
            return FoundSegment{std::move(attachment), check};
        }
    } catch (const std::system_error&) {
    }
    return std::nullopt;
}

}  // namespace

bool IsRingKey(key_t key) {
    return static_cast<std::uint32_t>(key) >> 24 == kKeyPrefix;
}

bool RemoveIfAbandoned(std::uint64_t installation, int shm_id) {
    shmid_ds status{};
    if (::shmctl(shm_id, IPC_STAT, &status) != 0 || status.shm_nattch != 0 || !IsOwn(status) ||
        base::ProcessStartTicks(status.shm_cpid) != 0) {
        return false;
    }
    try {
        const Attachment attachment(shm_id);
        if (CheckSegment(attachment.Address()) != SegmentCheck::kUnfinished ||
            !MayBeOurs(View(attachment.Address()).Head(), installation)) {
            return false;
        }
        attachment.RemoveSegment();
        return true;
    } catch (const std::system_error&) {
        return false;
    }
}

std::optional<FoundSegment> FindSegment(std::uint64_t installation, const StreamId& id) {
    const StreamKeys keys(installation, id);
    std::optional<FoundSegment> found;
    // Nearly always it has its first key.
    if (const int shm_id = ::shmget(keys.At(0), 0, 0); shm_id >= 0) {
        found = OpenIfStreams(shm_id, installation, id);
    }
    if (found) {
        return found;
    }
    ForEachOwnSegment([&](int shm_id, const shmid_ds& status) {
        if (!found && keys.Has(status.shm_perm.__key)) {
            found = OpenIfStreams(shm_id, installation, id);
        }
    });
    return found;
}

Attachment CreateSegment(std::uint64_t installation, const StreamId& id, const StreamFormat& format,
                         const Geometry& geometry) {
    return Finish(MakeUnderKey(installation, id, geometry), installation, id, format, geometry);
}

Attachment CreatePrivateSegment(const StreamId& id, const StreamFormat& format, const Geometry& geometry) {
    // Under a key until it is attached, so that the sweep finds it if this process is killed in between. Each process
    // and time has keys of its own.
    const std::uint64_t one_time =
        OwnWord() * 0x9e3779b97f4a7c15ULL ^ static_cast<std::uint64_t>(base::MonotonicMicros());
    Attachment attachment = MakeUnderKey(one_time, id, geometry);
    attachment.RemoveSegment();
    return Finish(std::move(attachment), 0, id, format, geometry);
}

}  // namespace lookhaven::ring
