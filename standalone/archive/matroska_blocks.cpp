// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/matroska_blocks.h"

#include <algorithm>
#include <array>
#include <bit>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

namespace {

// Element ids, including their length marker, as in the file.
constexpr std::uint32_t kEbml = 0x1A45DFA3;
constexpr std::uint32_t kSegment = 0x18538067;
constexpr std::uint32_t kSeekHead = 0x114D9B74;
constexpr std::uint32_t kInfo = 0x1549A966;
constexpr std::uint32_t kTimestampScale = 0x2AD7B1;
constexpr std::uint32_t kDateUtc = 0x4461;
constexpr std::uint32_t kTracks = 0x1654AE6B;
constexpr std::uint32_t kTrackEntry = 0xAE;
constexpr std::uint32_t kTrackNumber = 0xD7;
constexpr std::uint32_t kCodecId = 0x86;
constexpr std::uint32_t kCodecPrivate = 0x63A2;
constexpr std::uint32_t kVideo = 0xE0;
constexpr std::uint32_t kPixelWidth = 0xB0;
constexpr std::uint32_t kPixelHeight = 0xBA;
constexpr std::uint32_t kCluster = 0x1F43B675;
constexpr std::uint32_t kTimestamp = 0xE7;
constexpr std::uint32_t kSimpleBlock = 0xA3;
constexpr std::uint32_t kBlockGroup = 0xA0;
constexpr std::uint32_t kBlock = 0xA1;
constexpr std::uint32_t kReferenceBlock = 0xFB;
constexpr std::uint32_t kCues = 0x1C53BB6B;
constexpr std::uint32_t kTags = 0x1254C367;
constexpr std::uint32_t kVoid = 0xEC;

constexpr std::uint8_t kKeyFlag = 0x80;
constexpr std::uint8_t kLacingFlags = 0x06;
constexpr std::int64_t kYear2001Ms = 978'307'200'000;

// An EBML number: the leading zeros of its first byte say how many bytes follow.
struct VariableNumber {
    std::uint64_t with_marker = 0;
    std::uint64_t value = 0;
    std::size_t length = 0;

    bool IsUnknown() const { return value == (std::uint64_t{1} << (7 * length)) - 1; }
};

std::optional<VariableNumber> ParseNumber(std::span<const std::uint8_t> bytes, std::size_t max_bytes) {
    if (bytes.empty() || bytes[0] == 0) {
        return std::nullopt;
    }
    VariableNumber number;
    number.length = static_cast<std::size_t>(std::countl_zero(bytes[0])) + 1;
    if (number.length > max_bytes || number.length > bytes.size()) {
        return std::nullopt;
    }
    for (const std::uint8_t byte : bytes.first(number.length)) {
        number.with_marker = number.with_marker << 8 | byte;
    }
    number.value = number.with_marker & ((std::uint64_t{1} << (7 * number.length)) - 1);
    return number;
}

std::string CodecNameOf(const std::string& id, std::span<const std::uint8_t> private_data) {
    static constexpr std::pair<const char*, const char*> kCodecs[] = {
        {"V_MJPEG", "MJPEG"}, {"V_MPEG4/ISO/AVC", "H264"}, {"V_MPEGH/ISO/HEVC", "H265"},
        {"A_AAC", "AAC"},     {"A_OPUS", "OPUS"},
    };
    for (const auto& [known, name] : kCodecs) {
        if (id == known) {
            return name;
        }
    }
    // Sound in a Windows format: its private data begins with the format's number.
    if (id == "A_MS/ACM" && private_data.size() >= 2 && private_data[1] == 0) {
        return private_data[0] == 6 ? "PCMA" : private_data[0] == 7 ? "PCMU" : "";
    }
    return "";
}

}  // namespace

struct MatroskaBlocks::Element {
    std::uint32_t id = 0;
    std::uint64_t data = 0;
    std::uint64_t end = 0;
    bool is_endless = false;  // of unknown size

    std::uint64_t Size() const { return end - data; }
};

MatroskaBlocks::MatroskaBlocks(int file) : file_(file) {
    ReadHead();
}

std::uint64_t MatroskaBlocks::FileSize() const {
    struct stat status {};
    if (::fstat(file_, &status) != 0) {
        base::ThrowErrno("cannot read a recording");
    }
    return static_cast<std::uint64_t>(status.st_size);
}

// At most count bytes of the file; fewer at its end. Valid until the next call.
std::span<const std::uint8_t> MatroskaBlocks::Bytes(std::uint64_t at, std::size_t count) {
    constexpr std::size_t kWindowBytes = 4096;
    if (at < window_at_ || at + count > window_at_ + window_.size()) {
        window_.resize(std::max(kWindowBytes, count));
        const std::optional<std::size_t> got = base::ReadAllAt(file_, window_.data(), window_.size(), at);
        if (!got) {
            window_.clear();
            base::ThrowErrno("cannot read a recording");
        }
        window_.resize(*got);
        window_at_ = at;
    }
    const std::span<const std::uint8_t> rest = std::span(window_).subspan(at - window_at_);
    return rest.first(std::min(count, rest.size()));
}

// The element whose header begins at the position, even if it does not end inside the file.
std::optional<MatroskaBlocks::Element> MatroskaBlocks::ReadElementHead(std::uint64_t at) {
    const std::span<const std::uint8_t> head = Bytes(at, 12);
    const auto id = ParseNumber(head, 4);
    const auto size = id ? ParseNumber(head.subspan(id->length), 8) : std::nullopt;
    if (!size) {
        return std::nullopt;
    }
    const std::uint64_t data = at + id->length + size->length;
    return Element{static_cast<std::uint32_t>(id->with_marker), data, data + size->value, size->IsUnknown()};
}

// The element that begins at the position, if all of it is before the end.
std::optional<MatroskaBlocks::Element> MatroskaBlocks::ReadElement(std::uint64_t at, std::uint64_t end) {
    const std::optional<Element> element = at < end ? ReadElementHead(at) : std::nullopt;
    return element && !element->is_endless && element->end <= end ? element : std::nullopt;
}

// False when the children do not fill the parent exactly, or a visit says so.
template <class Visit>
bool MatroskaBlocks::ForEachChild(const Element& parent, Visit visit) {
    for (std::uint64_t at = parent.data; at < parent.end;) {
        const std::optional<Element> child = ReadElement(at, parent.end);
        if (!child || !visit(*child)) {
            return false;
        }
        at = child->end;
    }
    return true;
}

std::uint64_t MatroskaBlocks::Unsigned(const Element& element) {
    std::uint64_t number = 0;
    for (const std::uint8_t byte : Bytes(element.data, std::min<std::uint64_t>(element.Size(), 8))) {
        number = number << 8 | byte;
    }
    return number;
}

std::string MatroskaBlocks::Text(const Element& element) {
    const auto bytes = Bytes(element.data, std::min<std::uint64_t>(element.Size(), 64));
    return {bytes.begin(), std::find(bytes.begin(), bytes.end(), 0)};
}

void MatroskaBlocks::ReadHead() {
    const std::uint64_t size = FileSize();
    const std::optional<Element> ebml = ReadElement(0, size);
    // The segment has no size yet, or one that a cut file does not reach.
    const std::optional<Element> segment = ebml && ebml->id == kEbml ? ReadElementHead(ebml->end) : std::nullopt;
    if (!segment || segment->id != kSegment) {
        throw ArchiveError("no Matroska file");
    }
    position_ = segment->data;
    for (auto child = ReadElement(position_, size); child && child->id != kCluster;
         child = ReadElement(position_, size)) {
        if (child->id == kInfo) {
            ReadInfo(*child);
        } else if (child->id == kTracks) {
            ForEachChild(*child, [&](const Element& track) {
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
    ForEachChild(info, [&](const Element& element) {
        if (element.id == kTimestampScale) {
            timestamp_scale_ns_ = Unsigned(element);
        } else if (element.id == kDateUtc && element.Size() == 8) {
            const auto since_2001_ns = static_cast<std::int64_t>(Unsigned(element));
            header_.start_wall_ms = std::max<std::int64_t>(kYear2001Ms + since_2001_ns / 1'000'000, 0);
        }
        return true;
    });
    constexpr std::uint64_t kSecondNs = 1'000'000'000;
    if (timestamp_scale_ns_ == 0 || timestamp_scale_ns_ > kSecondNs) {
        throw ArchiveError("a Matroska file with an impossible unit of time");
    }
}

void MatroskaBlocks::ReadTrack(const Element& track) {
    std::uint64_t number = 0;
    std::string id;
    std::vector<std::uint8_t> private_data;
    int width = 0;
    int height = 0;
    ForEachChild(track, [&](const Element& element) {
        if (element.id == kTrackNumber) {
            number = Unsigned(element);
        } else if (element.id == kCodecId) {
            id = Text(element);
        } else if (element.id == kCodecPrivate) {
            const auto bytes = Bytes(element.data, std::min<std::uint64_t>(element.Size(), 2));
            private_data.assign(bytes.begin(), bytes.end());
        } else if (element.id == kVideo) {
            ForEachChild(element, [&](const Element& side) {
                if (side.id == kPixelWidth || side.id == kPixelHeight) {
                    (side.id == kPixelWidth ? width : height) = static_cast<int>(Unsigned(side) & 0xFFFF);
                }
                return true;
            });
        }
        return true;
    });
    const std::string codec = CodecNameOf(id, private_data);
    if (id.starts_with("A_")) {
        header_.audio_codec = codec;
    } else if (!codec.empty() && header_.codec.empty()) {
        header_.codec = codec;
        header_.width = width;
        header_.height = height;
        video_track_ = number;
    }
}

bool MatroskaBlocks::ReadCluster(std::vector<FrameEntry>& frames) {
    window_.clear();  // the file may have grown
    const std::uint64_t size = FileSize();
    for (;;) {
        const std::optional<Element> element = ReadElement(position_, size);
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
    const std::uint64_t size = FileSize();
    for (std::uint64_t at = position_ + 1; at < size && attempts_ < kMaxAttempts;) {
        const std::span<const std::uint8_t> bytes = Bytes(at, kStepBytes);
        const auto found = std::search(bytes.begin(), bytes.end(), kClusterId.begin(), kClusterId.end());
        if (found == bytes.end()) {
            at += std::max<std::size_t>(bytes.size(), kClusterId.size()) - (kClusterId.size() - 1);
            continue;
        }
        at += static_cast<std::uint64_t>(found - bytes.begin());
        ++attempts_;
        std::vector<FrameEntry> frames;
        const std::optional<Element> cluster = ReadElement(at, size);
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
    return ForEachChild(cluster, [&](const Element& element) {
        if (element.id == kTimestamp) {
            time = Unsigned(element);
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
        const bool read = time && ForEachChild(element, [&](const Element& part) {
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
    const auto head = Bytes(block.data, std::min<std::uint64_t>(block.Size(), 11));
    const auto track = ParseNumber(head, 8);
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
    const std::uint64_t time_ms = static_cast<std::uint64_t>(time) * timestamp_scale_ns_ / 1'000'000;
    if (time_ms > kMaxFrameTimeMs) {
        return false;
    }
    frames.push_back({frame, static_cast<std::uint32_t>(block.end - frame), static_cast<std::uint32_t>(time_ms),
                      simple && (flags & kKeyFlag) != 0});
    return true;
}

}  // namespace lookhaven::archive
