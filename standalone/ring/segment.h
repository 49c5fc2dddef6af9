// SPDX-License-Identifier: Apache-2.0
//
// The layout of a ring in shared memory, and the check of a segment.
//
// Format        | SegmentHead | ReaderSlot × kReaderSlots | IndexSlot × index_slots | arena |
//               The arena is counted in blocks of kBlockBytes. An entry fills whole blocks: its 44-byte head, then its
//               data. The entry with count c is described by index slot c % index_slots while that slot's count is c.
//               Counts begin at 1 and never repeat; the sequence number is (c - 1) % 10001.
//
// Protocol      Writer, to reuse a region: sets the counts of the index slots that describe it to 0, then looks through
//               the pins. Reader, to use an entry: reads its slot, stores the region as its pin, then reads the slot's
//               count again. All of these are sequentially consistent, so of a writer and a reader that meet, the
//               writer sees the pin, or the reader sees that the entry is gone. The writer skips pinned regions.
//
// Trust         A process that writes to a segment could change its geometry after the check. So an attachment copies
//               the constants to memory of this process; what is checked is the copy, and only the copy is used.
//
// Invariants    (1) The constants do not change once magic is there.
//               (2) A slot's region changes only while its count is 0, and no count is used twice.
//               (3) A reader slot's pin belongs to its owner; a free slot has no pin.
//
// Crash rule    Every step leaves the segment valid. A segment without magic is unfinished, and nobody's once its
//               creator is dead. A writer that dies between two steps leaves at worst an entry that the index does not
//               name; the next writer removes every entry from the index and begins behind the highest count. A reader
//               that dies leaves a slot whose owner is dead; the process that needs it frees it. An owner is one word
//               of process id and start time, so owning and releasing is one store.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <span>

#include "standalone/ring/stream.h"

namespace lookhaven::ring {

constexpr std::uint64_t kMagic = 0x676e69526e76684cULL;  // "LhvnRing" in memory on little-endian machines
constexpr std::uint32_t kLayoutVersion = 1;
constexpr std::uint32_t kReaderSlots = 512;
constexpr std::uint32_t kBlockBytes = 64;

struct SegmentConstants {
    // The same in every layout version.
    std::uint32_t layout_version;
    std::uint32_t generation;  // differs between segments
    std::uint64_t segment_bytes;
    std::uint64_t installation;
    std::int32_t camera;
    std::int32_t stream;
    std::int32_t medium;
    // This layout's.
    std::uint32_t reader_slots;
    std::uint32_t index_slots;
    std::uint32_t arena_blocks;
    std::int32_t width;
    std::int32_t height;
    std::uint32_t every_frame_is_key;
    std::uint32_t extra_length;
    char codec[kMaxCodecLength + 1];
    unsigned char extra_data[kMaxExtraBytes];
};

struct SegmentHead {
    std::atomic<std::uint64_t> magic;
    SegmentConstants constants;
    // Changing.
    alignas(64) std::atomic<std::uint64_t> writer;  // process word, 0 when the stream has ended
    std::atomic<std::uint64_t> index_of;  // the writer whose entries the index names; set once earlier ones are out
    std::atomic<std::int64_t> heartbeat_micros;
    std::atomic<std::uint64_t> newest;      // count of the newest entry, 0 when there was none
    std::atomic<std::uint64_t> newest_key;  // count of the newest key frame of this run, 0 when there is none
    std::atomic<std::uint64_t> dropped;
    std::atomic<std::uint32_t> retired;
    std::atomic<std::uint32_t> wake;  // futex word, changes with each entry
};

// What an attachment copies out of the segment. It lies in memory of this process that ends where the segment begins,
// since the segment's address is all that a ring's caller holds.
struct alignas(64) LocalHead {
    std::uint64_t magic;
    std::uint64_t real_bytes;    // of the segment, as the system counts them
    SegmentConstants constants;  // zeros without the magic
};

struct ReaderSlot {
    std::atomic<std::uint64_t> owner;  // process word, 0 when free
    std::atomic<std::uint64_t> pin;    // Region, 0 when nothing is pinned
};

struct IndexSlot {
    std::atomic<std::uint64_t> count;  // 0 when the slot describes nothing
    std::atomic<std::uint64_t> region;
};
static_assert(std::atomic<std::uint64_t>::is_always_lock_free, "segments are shared between processes");

// A region of the arena, in blocks.
struct Region {
    std::uint32_t first = 0;
    std::uint32_t blocks = 0;

    std::uint64_t End() const { return std::uint64_t{first} + blocks; }
    bool Overlaps(const Region& other) const { return first < other.End() && other.first < End(); }
    std::uint64_t Word() const { return (std::uint64_t{blocks} << 32) | first; }
    static Region FromWord(std::uint64_t word) {
        return {static_cast<std::uint32_t>(word), static_cast<std::uint32_t>(word >> 32)};
    }
};

constexpr std::int32_t SequenceOf(std::uint64_t count) {
    return static_cast<std::int32_t>((count - 1) % (kLastSequence + 1));
}

// A checked segment at the address of its attachment, which it borrows.
class View {
  public:
    explicit View(const void* address) : base_(static_cast<unsigned char*>(const_cast<void*>(address))) {}

    SegmentHead& Head() const { return *reinterpret_cast<SegmentHead*>(base_); }
    const LocalHead& Local() const { return *reinterpret_cast<const LocalHead*>(base_ - sizeof(LocalHead)); }
    const SegmentConstants& Constants() const { return Local().constants; }
    std::span<ReaderSlot> Readers() const;
    IndexSlot& Slot(std::uint64_t count) const;
    // Raw memory of the region, which must lie inside the arena.
    unsigned char* Memory(const Region& region) const;
    // The entry there, or null when region or entry is impossible. The caller has it pinned.
    const Entry* EntryAt(const Region& region) const;
    StreamId Id() const;
    StreamFormat Format() const;
    Geometry Size() const;

  private:
    unsigned char* base_;
};

enum class SegmentCheck { kGood, kUnfinished, kNotARing, kOtherLayout, kDamaged };

// Checks the segment of the attachment at the address.
SegmentCheck CheckSegment(const void* address);

std::uint64_t SegmentBytes(const Geometry& geometry);

// The format as a segment keeps it: name cut at kMaxCodecLength, oversized extra data left out.
StreamFormat Storable(StreamFormat format);

}  // namespace lookhaven::ring
