// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/segment.h"

#include <algorithm>

namespace lookhaven::ring {

namespace {

constexpr std::uint64_t kReadersOffset = (sizeof(SegmentHead) + 63) / 64 * 64;
constexpr std::uint64_t kIndexOffset = kReadersOffset + kReaderSlots * sizeof(ReaderSlot);

std::uint64_t ArenaOffset(std::uint32_t index_slots) {
    return (kIndexOffset + index_slots * sizeof(IndexSlot) + 63) / 64 * 64;
}

// Counts go up by one from 1, so none comes near the end of its range, where the arithmetic with them would wrap.
bool HasPossibleCounts(const View& view) {
    constexpr std::uint64_t kImpossible = std::uint64_t{1} << 62;
    std::uint64_t highest = view.Head().newest.load();
    for (std::uint32_t i = 0; i < view.Constants().index_slots; ++i) {
        highest = std::max(highest, view.Slot(i).count.load());
    }
    return highest < kImpossible;
}

}  // namespace

std::span<ReaderSlot> View::Readers() const {
    return {reinterpret_cast<ReaderSlot*>(base_ + kReadersOffset), kReaderSlots};
}

IndexSlot& View::Slot(std::uint64_t count) const {
    return reinterpret_cast<IndexSlot*>(base_ + kIndexOffset)[count % Constants().index_slots];
}

unsigned char* View::Memory(const Region& region) const {
    return base_ + ArenaOffset(Constants().index_slots) + std::uint64_t{region.first} * kBlockBytes;
}

const Entry* View::EntryAt(const Region& region) const {
    if (region.blocks == 0 || region.End() > Constants().arena_blocks) {
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
    return {Constants().camera, Constants().stream, static_cast<Medium>(Constants().medium)};
}

StreamFormat View::Format() const {
    const SegmentConstants& constants = Constants();
    return {constants.codec,
            {constants.extra_data, constants.extra_data + constants.extra_length},
            constants.width,
            constants.height,
            constants.every_frame_is_key != 0};
}

Geometry View::Size() const {
    return {Constants().index_slots, std::uint64_t{Constants().arena_blocks} * kBlockBytes};
}

SegmentCheck CheckSegment(const void* address) {
    const View view(address);
    const LocalHead& local = view.Local();
    if (local.magic != kMagic) {
        return local.magic == 0 && local.real_bytes >= sizeof(SegmentHead) ? SegmentCheck::kUnfinished
                                                                           : SegmentCheck::kNotARing;
    }
    const SegmentConstants& constants = local.constants;
    if (constants.layout_version != kLayoutVersion) {
        return SegmentCheck::kOtherLayout;
    }
    const bool whole = constants.segment_bytes == local.real_bytes && constants.reader_slots == kReaderSlots &&
                       constants.index_slots >= 2 && constants.index_slots <= kLastSequence &&
                       constants.extra_length <= kMaxExtraBytes && constants.codec[kMaxCodecLength] == '\0' &&
                       SegmentBytes(view.Size()) == local.real_bytes && HasPossibleCounts(view);
    return whole ? SegmentCheck::kGood : SegmentCheck::kDamaged;
}

std::uint64_t SegmentBytes(const Geometry& geometry) {
    return ArenaOffset(geometry.index_slots) + geometry.arena_bytes / kBlockBytes * kBlockBytes;
}

StreamFormat Storable(StreamFormat format) {
    format.codec.resize(std::min(format.codec.size(), kMaxCodecLength));
    if (format.extra_data.size() > kMaxExtraBytes) {
        format.extra_data.clear();
    }
    return format;
}

}  // namespace lookhaven::ring
