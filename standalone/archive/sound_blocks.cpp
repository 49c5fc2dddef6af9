// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/sound_blocks.h"

#include <cstdlib>
#include <optional>

#include "standalone/archive/matroska_ids.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

using namespace matroska;
using Element = EbmlReader::Element;

namespace {

// Sound of some seconds; more is damage.
constexpr std::uint64_t kMaxBetweenBytes = 1 << 22;
// Sound lies near its time; elsewhere is damage.
constexpr std::int64_t kMaxSkewMs = 30'000;
// Before the data of a block: its time in the cluster, and its flags.
constexpr std::size_t kBlockTailBytes = 3;

std::int16_t RelativeTime(std::span<const std::uint8_t> bytes) {
    return static_cast<std::int16_t>(bytes[0] << 8 | bytes[1]);
}

}  // namespace

SoundBlocks::SoundBlocks(int file, const MatroskaTracks& tracks)
    : ebml_(file),
      timestamp_scale_ns_(tracks.timestamp_scale_ns),
      track_(tracks.audio_track) {}

std::vector<SoundBlock> SoundBlocks::Between(const FrameEntry& frame, std::uint64_t next_offset) {
    std::vector<SoundBlock> found;
    const std::uint64_t begin = frame.offset + frame.size;
    if (track_ == 0 || frame.offset < kBlockTailBytes || next_offset < begin ||
        next_offset - begin > kMaxBetweenBytes) {
        return found;
    }
    ebml_.Forget();  // the file may have grown
    std::int64_t cluster_time = ClusterTimeOf(frame);
    for (std::uint64_t at = begin; at < next_offset;) {
        const std::optional<Element> element = ebml_.ReadElementHead(at);
        if (!element) {
            break;
        }
        if (element->id == kCluster || element->id == kBlockGroup) {
            at = element->data;
            continue;
        }
        if (element->is_endless || element->end > next_offset) {
            break;  // the block of the next frame, unless it is damage
        }
        if (element->id == kTimestamp) {
            cluster_time = static_cast<std::int64_t>(ebml_.Unsigned(*element) & UINT32_MAX);
        } else if (element->id == kSimpleBlock || element->id == kBlock) {
            AddBlock(*element, cluster_time, frame, found);
        }
        at = element->end;
    }
    return found;
}

// By the frame's own time, whose block says how much later than its cluster it is.
std::int64_t SoundBlocks::ClusterTimeOf(const FrameEntry& frame) {
    const auto tail = ebml_.Bytes(frame.offset - kBlockTailBytes, kBlockTailBytes);
    const std::uint64_t time_ns = std::uint64_t{frame.time_ms} * 1'000'000;
    return static_cast<std::int64_t>(time_ns / timestamp_scale_ns_) -
           (tail.size() < kBlockTailBytes ? 0 : RelativeTime(tail));
}

void SoundBlocks::AddBlock(const Element& block, std::int64_t cluster_time, const FrameEntry& frame,
                           std::vector<SoundBlock>& found) {
    const auto head = ebml_.Bytes(block.data, block.SizeUpTo(8 + kBlockTailBytes));
    const auto track = EbmlNumber::Parse(head, 8);
    if (!track || track->value != track_ || head.size() < track->length + kBlockTailBytes) {
        return;
    }
    const auto tail = head.subspan(track->length);
    const std::int64_t time = cluster_time + RelativeTime(tail);
    const std::uint64_t offset = block.data + track->length + kBlockTailBytes;
    if (time < 0 || (tail[2] & kLacingFlags) != 0 || offset == block.end || block.end - offset > base::kMaxFrameBytes) {
        return;
    }
    const auto time_ms = static_cast<std::int64_t>(static_cast<std::uint64_t>(time) * timestamp_scale_ns_ / 1'000'000);
    if (std::abs(time_ms - std::int64_t{frame.time_ms}) <= kMaxSkewMs) {
        found.push_back({offset, static_cast<std::uint32_t>(block.end - offset), time_ms});
    }
}

}  // namespace lookhaven::archive
