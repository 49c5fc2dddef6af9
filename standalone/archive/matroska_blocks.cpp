// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/matroska_blocks.h"

#include <algorithm>
#include <array>
#include <utility>

#include "standalone/archive/matroska_ids.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

using namespace matroska;

namespace {

// Parameter sets of a camera have some hundred bytes.
constexpr std::size_t kMaxPrivateBytes = 65536;
// Before the first cluster.
constexpr int kMaxHeadElements = 1'000;
constexpr std::uint8_t kKeyFlag = 0x80;
constexpr std::int64_t kYear2001Ms = 978'307'200'000;

using base::Codec;

std::string CodecNameOf(const std::string& id, std::span<const std::uint8_t> private_data) {
    static constexpr std::pair<const char*, Codec> kCodecs[] = {
        {"V_MJPEG", Codec::kMjpeg}, {"V_MPEG4/ISO/AVC", Codec::kH264}, {"V_MPEGH/ISO/HEVC", Codec::kH265},
        {"A_AAC", Codec::kAac},     {"A_OPUS", Codec::kOpus},
    };
    for (const auto& [known, codec] : kCodecs) {
        if (id == known) {
            return base::CodecName(codec);
        }
    }
    // Sound in a Windows format: its private data begins with the format's number.
    if (id == "A_MS/ACM" && private_data.size() >= 2 && private_data[1] == 0) {
        return private_data[0] == 6   ? base::CodecName(Codec::kPcmAlaw)
               : private_data[0] == 7 ? base::CodecName(Codec::kPcmMulaw)
                                      : "";
    }
    return "";
}

}  // namespace

using Element = EbmlReader::Element;

MatroskaBlocks::MatroskaBlocks(int file) : ebml_(file) {
    ReadHead();
}

void MatroskaBlocks::ReadHead() {
    const std::uint64_t size = ebml_.FileSize();
    const std::optional<Element> ebml = ebml_.ReadElement(0, size);
    // The segment has no size yet, or one that a cut file does not reach.
    const std::optional<Element> segment = ebml && ebml->id == kEbml ? ebml_.ReadElementHead(ebml->end) : std::nullopt;
    if (!segment || segment->id != kSegment) {
        throw ArchiveError("no Matroska file");
    }
    position_ = segment->data;
    int elements = 0;
    for (auto child = ebml_.ReadElement(position_, size); child && child->id != kCluster;
         child = ebml_.ReadElement(position_, size)) {
        if (++elements > kMaxHeadElements) {
            throw ArchiveError("a Matroska file with too much before its first frame");
        }
        if (child->id == kInfo) {
            ReadInfo(*child);
        } else if (child->id == kTracks) {
            ebml_.ForEachChild(*child, [&](const Element& track) {
                if (track.id == kTrackEntry) {
                    ReadTrack(track);
                }
                return true;
            });
        }
        position_ = child->end;
    }
    if (!IsPossible(header_)) {
        throw ArchiveError("a Matroska file without a video track that is known");
    }
}

void MatroskaBlocks::ReadInfo(const Element& info) {
    ebml_.ForEachChild(info, [&](const Element& element) {
        if (element.id == kTimestampScale) {
            tracks_.timestamp_scale_ns = ebml_.Unsigned(element);
        } else if (element.id == kDateUtc && element.Size() == 8) {
            const auto since_2001_ns = static_cast<std::int64_t>(ebml_.Unsigned(element));
            header_.start_wall_ms = std::max<std::int64_t>(kYear2001Ms + since_2001_ns / 1'000'000, 0);
        }
        return true;
    });
    constexpr std::uint64_t kSecondNs = 1'000'000'000;
    if (tracks_.timestamp_scale_ns == 0 || tracks_.timestamp_scale_ns > kSecondNs) {
        throw ArchiveError("a Matroska file with an impossible unit of time");
    }
}

void MatroskaBlocks::ReadTrack(const Element& track) {
    std::uint64_t number = 0;
    std::string id;
    std::vector<std::uint8_t> private_data;
    bool is_whole = true;
    int width = 0;
    int height = 0;
    ebml_.ForEachChild(track, [&](const Element& element) {
        if (element.id == kTrackNumber) {
            number = ebml_.Unsigned(element);
        } else if (element.id == kCodecId) {
            id = ebml_.Text(element);
        } else if (element.id == kCodecPrivate) {
            const auto bytes = ebml_.Bytes(element.data, element.SizeUpTo(kMaxPrivateBytes));
            private_data.assign(bytes.begin(), bytes.end());
            is_whole = bytes.size() == element.Size();
        } else if (element.id == kVideo) {
            ebml_.ForEachChild(element, [&](const Element& side) {
                if (side.id == kPixelWidth || side.id == kPixelHeight) {
                    (side.id == kPixelWidth ? width : height) = static_cast<int>(ebml_.Unsigned(side) & 0xFFFF);
                }
                return true;
            });
        }
        return true;
    });
    const std::string codec = CodecNameOf(id, private_data);
    if (!is_whole) {
        private_data.clear();
    }
    if (id.starts_with("A_")) {
        header_.audio_codec = codec;
        tracks_.audio_track = codec.empty() ? 0 : number;
        tracks_.audio_private = std::move(private_data);
    } else if (!codec.empty() && header_.codec.empty()) {
        header_.codec = codec;
        header_.width = width;
        header_.height = height;
        tracks_.video_private = std::move(private_data);
        video_track_ = number;
    }
}

bool MatroskaBlocks::ReadCluster(std::vector<FrameEntry>& frames) {
    ebml_.Forget();  // the file may have grown
    const std::uint64_t size = ebml_.FileSize();
    for (;;) {
        const std::optional<Element> element = ebml_.ReadElement(position_, size);
        if (!element) {
            return false;
        }
        if (element->id == kCluster) {
            const std::size_t before = frames.size();
            if (!ReadFrames(*element, frames)) {
                frames.resize(before);
                return false;
            }
            position_ = element->end;
            return true;
        }
        if (element->id != kVoid && element->id != kCues && element->id != kTags && element->id != kSeekHead) {
            return false;
        }
        position_ = element->end;
    }
}

bool MatroskaBlocks::SkipDamage() {
    constexpr std::size_t kStepBytes = 1 << 16;
    constexpr std::array<std::uint8_t, 4> kClusterId{0x1F, 0x43, 0xB6, 0x75};
    // What looks like a cluster may lie within a frame; a file made for it could hold one in every fourth byte.
    constexpr int kMaxAttempts = 1000;
    const std::uint64_t size = ebml_.FileSize();
    for (std::uint64_t at = position_ + 1; at < size && attempts_ < kMaxAttempts;) {
        const std::span<const std::uint8_t> bytes = ebml_.Bytes(at, kStepBytes);
        const auto found = std::search(bytes.begin(), bytes.end(), kClusterId.begin(), kClusterId.end());
        if (found == bytes.end()) {
            at += std::max<std::size_t>(bytes.size(), kClusterId.size()) - (kClusterId.size() - 1);
            continue;
        }
        at += static_cast<std::uint64_t>(found - bytes.begin());
        ++attempts_;
        std::vector<FrameEntry> frames;
        const std::optional<Element> cluster = ebml_.ReadElement(at, size);
        if (cluster && ReadFrames(*cluster, frames) && !frames.empty()) {
            position_ = at;
            return true;
        }
        ++at;
    }
    return false;
}

bool MatroskaBlocks::ReadFrames(const Element& cluster, std::vector<FrameEntry>& frames) {
    std::optional<std::uint64_t> time;
    return ebml_.ForEachChild(cluster, [&](const Element& element) {
        if (element.id == kTimestamp) {
            time = ebml_.Unsigned(element);
            return *time <= UINT32_MAX;
        }
        if (element.id == kSimpleBlock) {
            return time && ReadBlock(element, *time, true, frames);
        }
        if (element.id != kBlockGroup) {
            return true;
        }
        const std::size_t before = frames.size();
        bool refers = false;
        const bool read = time && ebml_.ForEachChild(element, [&](const Element& part) {
            refers |= part.id == kReferenceBlock;
            return part.id != kBlock || ReadBlock(part, *time, false, frames);
        });
        for (std::size_t i = before; i < frames.size(); ++i) {
            frames[i].key = !refers;
        }
        return read;
    });
}

// True when the block is another track's, or its frame was appended.
bool MatroskaBlocks::ReadBlock(const Element& block, std::uint64_t cluster_time, bool simple,
                               std::vector<FrameEntry>& frames) {
    const auto head = ebml_.Bytes(block.data, block.SizeUpTo(11));
    const auto track = EbmlNumber::Parse(head, 8);
    if (!track || head.size() < track->length + 3) {
        return false;
    }
    if (track->value != video_track_) {
        return true;
    }
    const auto rest = head.subspan(track->length);
    const auto relative = static_cast<std::int16_t>(rest[0] << 8 | rest[1]);
    const std::uint8_t flags = rest[2];
    const std::int64_t time = static_cast<std::int64_t>(cluster_time) + relative;
    const std::uint64_t frame = block.data + track->length + 3;
    if (time < 0 || (flags & kLacingFlags) != 0 || frame == block.end || block.end - frame > base::kMaxFrameBytes) {
        return false;
    }
    const std::uint64_t time_ms = static_cast<std::uint64_t>(time) * tracks_.timestamp_scale_ns / 1'000'000;
    if (time_ms > kMaxFrameTimeMs) {
        return false;
    }
    frames.push_back({frame, static_cast<std::uint32_t>(block.end - frame), static_cast<std::uint32_t>(time_ms),
                      simple && (flags & kKeyFlag) != 0});
    return true;
}

}  // namespace lookhaven::archive
