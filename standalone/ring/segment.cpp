// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/segment.h"

#include <algorithm>
#include <cerrno>
#include <new>
#include <system_error>

#include <sys/ipc.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/ring/process_word.h"

namespace lookhaven::ring {

namespace {

constexpr std::uint32_t kKeyMark = 0x4c000000;
constexpr int kMode = 0600;  // rings are the service account's alone
constexpr int kProbes = 8;   // keys that one stream may have, tried in turn when others' segments collide

constexpr std::uint64_t kReadersOffset = (sizeof(SegmentHead) + 63) / 64 * 64;
constexpr std::uint64_t kIndexOffset = kReadersOffset + kReaderSlots * sizeof(ReaderSlot);

std::uint64_t ArenaOffset(std::uint32_t index_slots) {
    return (kIndexOffset + index_slots * sizeof(IndexSlot) + 63) / 64 * 64;
}

key_t KeyOf(std::uint64_t installation, const StreamId& id, int probe) {
    std::uint64_t hash = installation;
    for (const std::int32_t part : {id.camera, id.stream, static_cast<std::int32_t>(id.medium), probe}) {
        hash = (hash ^ static_cast<std::uint32_t>(part)) * 0x9e3779b97f4a7c15ULL;
        hash ^= hash >> 32;
    }
    return static_cast<key_t>(kKeyMark | (static_cast<std::uint32_t>(hash) & 0xffffff));
}

shmid_ds StatusOf(int shm_id) {
    shmid_ds status{};
    if (::shmctl(shm_id, IPC_STAT, &status) != 0) {
        base::ThrowErrno("cannot examine shared memory");
    }
    return status;
}

// Opens the segment that has the key; nothing when there is none or it vanishes meanwhile.
std::optional<Attachment> OpenKey(key_t key) {
    const int shm_id = ::shmget(key, 0, 0);
    if (shm_id < 0) {
        return std::nullopt;
    }
    try {
        return Attachment(shm_id);
    } catch (const std::system_error&) {
        return std::nullopt;
    }
}

void FillHead(SegmentHead& head, std::uint64_t installation, const StreamId& id, const StreamFormat& format,
              const Geometry& geometry) {
    head.installation = installation;
    std::atomic_signal_fence(std::memory_order_seq_cst);  // whoever dies from here on leaves a head that says whose
    head.layout_version = kLayoutVersion;
    head.generation = static_cast<std::uint32_t>(base::MonotonicMicros());
    head.segment_bytes = SegmentBytes(geometry);
    head.camera = id.camera;
    head.stream = id.stream;
    head.medium = static_cast<std::int32_t>(id.medium);
    head.reader_slots = kReaderSlots;
    head.index_slots = geometry.index_slots;
    head.arena_blocks = static_cast<std::uint32_t>(geometry.arena_bytes / kBlockBytes);
    head.width = format.width;
    head.height = format.height;
    head.every_frame_is_key = format.every_frame_is_key ? 1 : 0;
    const StreamFormat stored = Storable(format);
    stored.codec.copy(head.codec, kMaxCodecLength);
    head.extra_length = static_cast<std::uint32_t>(stored.extra_data.size());
    std::ranges::copy(stored.extra_data, head.extra_data);
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

// A segment of zeros under one of the keys that the installation has for the stream.
Attachment MakeUnderKey(std::uint64_t installation, const StreamId& id, const Geometry& geometry) {
    for (int probe = 0; probe < kProbes; ++probe) {
        const key_t key = KeyOf(installation, id, probe);
        if (const int left_over = ::shmget(key, 0, 0); left_over >= 0) {
            RemoveIfAbandoned(installation, left_over);
        }
        const int shm_id = ::shmget(key, SegmentBytes(geometry), IPC_CREAT | IPC_EXCL | kMode);
        if (shm_id >= 0) {
            return AttachNew(shm_id);
        }
        if (errno != EEXIST) {
            break;
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
    return attachment;
}

// Counts go up by one from 1, so none comes near the end of its range, where the arithmetic with them would wrap.
bool HasPossibleCounts(const View& view) {
    constexpr std::uint64_t kImpossible = std::uint64_t{1} << 62;
    std::uint64_t highest = view.Head().newest.load();
    for (std::uint32_t i = 0; i < view.Head().index_slots; ++i) {
        highest = std::max(highest, view.Slot(i).count.load());
    }
    return highest < kImpossible;
}

// Other programs may have segments under keys like ours. One of ours is all zeros or says whose it is.
bool MayBeOurs(const SegmentHead& head, std::uint64_t installation) {
    const std::span bytes(reinterpret_cast<const unsigned char*>(&head), sizeof head);
    return head.installation == installation ||
           std::ranges::all_of(bytes, [](unsigned char byte) { return byte == 0; });
}

}  // namespace

std::span<ReaderSlot> View::Readers() const {
    return {reinterpret_cast<ReaderSlot*>(base_ + kReadersOffset), kReaderSlots};
}

IndexSlot& View::Slot(std::uint64_t count) const {
    return reinterpret_cast<IndexSlot*>(base_ + kIndexOffset)[count % Head().index_slots];
}

unsigned char* View::Memory(const Region& region) const {
    return base_ + ArenaOffset(Head().index_slots) + std::uint64_t{region.first} * kBlockBytes;
}

const Entry* View::EntryAt(const Region& region) const {
    if (region.blocks == 0 || region.End() > Head().arena_blocks) {
        return nullptr;
    }
    const auto* entry = reinterpret_cast<const Entry*>(Memory(region));
    const bool possible =
        entry->length >= 1 && entry->length <= base::kMaxFrameBytes && entry->offset >= 0 &&
        entry->offset < entry->length &&
        sizeof(Entry) + static_cast<std::uint64_t>(entry->length) <= std::uint64_t{region.blocks} * kBlockBytes;
    return possible ? entry : nullptr;
}

StreamId View::Id() const {
    return {Head().camera, Head().stream, static_cast<Medium>(Head().medium)};
}

StreamFormat View::Format() const {
    const SegmentHead& head = Head();
    return {head.codec,
            {head.extra_data, head.extra_data + head.extra_length},
            head.width,
            head.height,
            head.every_frame_is_key != 0};
}

Geometry View::Size() const {
    return {Head().index_slots, std::uint64_t{Head().arena_blocks} * kBlockBytes};
}

Attachment::Attachment(int shm_id, bool read_only) : shm_id_(shm_id) {
    void* address = ::shmat(shm_id, nullptr, read_only ? SHM_RDONLY : 0);
    if (address == reinterpret_cast<void*>(-1)) {
        base::ThrowErrno("cannot attach shared memory");
    }
    address_ = address;
}

Attachment& Attachment::operator=(Attachment&& other) noexcept {
    std::swap(shm_id_, other.shm_id_);
    std::swap(address_, other.address_);
    return *this;
}

Attachment::~Attachment() {
    if (address_ != nullptr) {
        ::shmdt(address_);
    }
}

void* Attachment::Release() {
    return std::exchange(address_, nullptr);
}

void Attachment::RemoveSegment() const {
    ::shmctl(shm_id_, IPC_RMID, nullptr);
}

SegmentCheck CheckSegment(const void* address, std::uint64_t real_bytes) {
    if (real_bytes < sizeof(SegmentHead)) {
        return SegmentCheck::kNotARing;
    }
    const SegmentHead& head = View(address).Head();
    const std::uint64_t magic = head.magic.load();
    if (magic != kMagic) {
        return magic == 0 ? SegmentCheck::kUnfinished : SegmentCheck::kNotARing;
    }
    if (head.layout_version != kLayoutVersion) {
        return SegmentCheck::kOtherLayout;
    }
    const bool whole = head.segment_bytes == real_bytes && head.reader_slots == kReaderSlots && head.index_slots >= 2 &&
                       head.index_slots <= kLastSequence && head.extra_length <= kMaxExtraBytes &&
                       head.codec[kMaxCodecLength] == '\0' && SegmentBytes(View(address).Size()) == real_bytes &&
                       HasPossibleCounts(View(address));
    return whole ? SegmentCheck::kGood : SegmentCheck::kDamaged;
}

std::uint64_t SegmentBytes(const Geometry& geometry) {
    return ArenaOffset(geometry.index_slots) + geometry.arena_bytes / kBlockBytes * kBlockBytes;
}

bool IsRingKey(key_t key) {
    return (static_cast<std::uint32_t>(key) & 0xff000000) == kKeyMark;
}

bool RemoveIfAbandoned(std::uint64_t installation, int shm_id) {
    shmid_ds status{};
    if (::shmctl(shm_id, IPC_STAT, &status) != 0 || status.shm_nattch != 0 || (status.shm_perm.mode & 0777) != kMode ||
        base::ProcessStartTicks(status.shm_cpid) != 0) {
        return false;
    }
    try {
        const Attachment attachment(shm_id);
        if (CheckSegment(attachment.Address(), status.shm_segsz) != SegmentCheck::kUnfinished ||
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
    for (int probe = 0; probe < kProbes; ++probe) {
        std::optional<Attachment> attachment = OpenKey(KeyOf(installation, id, probe));
        if (!attachment) {
            continue;
        }
        const SegmentCheck check = CheckSegment(attachment->Address(), StatusOf(attachment->ShmId()).shm_segsz);
        if (check == SegmentCheck::kNotARing || check == SegmentCheck::kUnfinished) {
            continue;
        }
        const View view(attachment->Address());
        const bool is_current = check == SegmentCheck::kOtherLayout || view.Head().retired.load() == 0;
        if (view.Head().installation == installation && view.Id() == id && is_current) {
            return FoundSegment{std::move(*attachment), check};
        }
    }
    return std::nullopt;
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

StreamFormat Storable(StreamFormat format) {
    format.codec.resize(std::min(format.codec.size(), kMaxCodecLength));
    if (format.extra_data.size() > kMaxExtraBytes) {
        format.extra_data.clear();
    }
    return format;
}

}  // namespace lookhaven::ring
