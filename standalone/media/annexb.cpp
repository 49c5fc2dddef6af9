// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/annexb.h"

#include <algorithm>
#include <array>

namespace lookhaven::media {

namespace {

constexpr std::array<std::uint8_t, 4> kStartCode{0, 0, 0, 1};
// The standards allow 288 sets for H.264 and 96 for H.265; cameras send a handful of a hundred bytes.
constexpr std::size_t kMaxSets = 512;
constexpr std::size_t kMaxSetBytes = 65536;

bool IsStartCode(std::span<const std::uint8_t> bytes) {
    return bytes.size() >= 3 && bytes[0] == 0 && bytes[1] == 0 && bytes[2] == 1;
}

// The position just after the next start code, or the frame's size.
std::size_t AfterStartCode(std::span<const std::uint8_t> frame, std::size_t from) {
    for (std::size_t i = from; i + 3 <= frame.size(); ++i) {
        if (IsStartCode(frame.subspan(i))) {
            return i + 3;
        }
    }
    return frame.size();
}

enum class Unit { kSequenceSet, kPictureSet, kOtherSet, kKeyPicture, kPicture, kOther };

Unit UnitAt(Codec codec, std::uint8_t head) {
    if (codec == Codec::kH264) {
        switch (const int type = head & 0x1f) {
        case 7:
            return Unit::kSequenceSet;
        case 8:
            return Unit::kPictureSet;
        case 5:
            return Unit::kKeyPicture;
        default:
            return type >= 1 && type < 5 ? Unit::kPicture : Unit::kOther;
        }
    }
    switch (const int type = (head >> 1) & 0x3f) {
    case 33:
        return Unit::kSequenceSet;
    case 34:
        return Unit::kPictureSet;
    case 32:
        return Unit::kOtherSet;
    default:
        return type >= 16 && type < 24 ? Unit::kKeyPicture : type < 32 ? Unit::kPicture : Unit::kOther;
    }
}

bool IsPicture(Unit unit) {
    return unit == Unit::kPicture || unit == Unit::kKeyPicture;
}

// The frame's first slice; kOther when it has none.
Unit FirstSlice(Codec codec, std::span<const std::uint8_t> frame) {
    for (std::size_t at = AfterStartCode(frame, 0); at < frame.size(); at = AfterStartCode(frame, at)) {
        if (const Unit unit = UnitAt(codec, frame[at]); IsPicture(unit)) {
            return unit;
        }
    }
    return Unit::kOther;
}

}  // namespace

bool IsKeyFrame(Codec codec, std::span<const std::uint8_t> frame) {
    return FirstSlice(codec, frame) == Unit::kKeyPicture;
}

bool HasPicture(Codec codec, std::span<const std::uint8_t> frame) {
    return IsPicture(FirstSlice(codec, frame));
}

bool MayBeginPicture(Codec codec, std::span<const std::uint8_t> piece) {
    const std::size_t at = AfterStartCode(piece, 0);
    const std::size_t head_bytes = codec == Codec::kH264 ? 1 : 2;
    // A later fragment of a unit does not begin with a start code; one found further inside is a coincidence.
    if (at > kStartCode.size() || at + head_bytes >= piece.size()) {
        return false;
    }
    // The first slice of a picture says so in its first bit.
    return !IsPicture(UnitAt(codec, piece[at])) || (piece[at + head_bytes] & 0x80) != 0;
}

ParameterSets::ParameterSets(Codec codec, std::span<const std::uint8_t> initial)
    : codec_(codec),
      current_(SetsOf(initial)) {}

std::span<const std::uint8_t> ParameterSets::Complete(std::span<const std::uint8_t> key_frame) {
    if (std::vector<std::uint8_t> sets = SetsOf(key_frame); !sets.empty()) {
        current_ = std::move(sets);
        return key_frame;
    }
    completed_ = current_;
    completed_.insert(completed_.end(), key_frame.begin(), key_frame.end());
    return completed_;
}

// Parameter sets precede the picture, so the search ends there. Empty unless the frame has both kinds, and in sane
// numbers: each set is compared with those before it.
std::vector<std::uint8_t> ParameterSets::SetsOf(std::span<const std::uint8_t> frame) const {
    std::vector<std::span<const std::uint8_t>> known;
    std::vector<std::uint8_t> sets;
    std::size_t count = 0;
    bool has_sequence_set = false;
    bool has_picture_set = false;
    for (std::size_t begin = AfterStartCode(frame, 0); begin < frame.size();) {
        const Unit unit = UnitAt(codec_, frame[begin]);
        if (IsPicture(unit)) {
            break;
        }
        const std::size_t next = AfterStartCode(frame, begin);
        if (unit != Unit::kOther) {
            auto set = frame.subspan(begin, next - begin);
            if (set.size() >= 3 && IsStartCode(set.last(3))) {
                set = set.first(set.size() - 3);
            }
            while (!set.empty() && set.back() == 0) {
                set = set.first(set.size() - 1);  // the extra zeros of a longer start code belong to no unit
            }
            if (++count > kMaxSets || sets.size() + set.size() > kMaxSetBytes) {
                return {};
            }
            if (std::ranges::none_of(known, [&](auto other) { return std::ranges::equal(other, set); })) {
                known.push_back(set);
                sets.insert(sets.end(), kStartCode.begin(), kStartCode.end());
                sets.insert(sets.end(), set.begin(), set.end());
            }
            has_sequence_set |= unit == Unit::kSequenceSet;
            has_picture_set |= unit == Unit::kPictureSet;
        }
        begin = next;
    }
    return has_sequence_set && has_picture_set ? sets : std::vector<std::uint8_t>{};
}

}  // namespace lookhaven::media
