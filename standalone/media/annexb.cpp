// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/annexb.h"

#include <array>

namespace lookhaven::media {

namespace {

constexpr std::array<std::uint8_t, 4> kStartCode{0, 0, 0, 1};

// The position just behind the next start code, or the frame's size.
std::size_t AfterStartCode(std::span<const std::uint8_t> frame, std::size_t from) {
    for (std::size_t i = from; i + 3 <= frame.size(); ++i) {
        if (frame[i] == 0 && frame[i + 1] == 0 && frame[i + 2] == 1) {
            return i + 3;
        }
    }
    return frame.size();
}

enum class Unit { kSequenceSet, kPictureSet, kOtherSet, kPicture, kOther };

Unit UnitAt(Codec codec, std::uint8_t head) {
    if (codec == Codec::kH264) {
        const int type = head & 0x1f;
        return type == 7                ? Unit::kSequenceSet
               : type == 8              ? Unit::kPictureSet
               : type >= 1 && type <= 5 ? Unit::kPicture
                                        : Unit::kOther;
    }
    const int type = (head >> 1) & 0x3f;
    return type == 33   ? Unit::kSequenceSet
           : type == 34 ? Unit::kPictureSet
           : type == 32 ? Unit::kOtherSet
           : type < 32  ? Unit::kPicture
                        : Unit::kOther;
}

}  // namespace

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

// Sets stand in front of the picture, so the search ends there; without both kinds it comes to nothing.
std::vector<std::uint8_t> ParameterSets::SetsOf(std::span<const std::uint8_t> frame) const {
    std::vector<std::uint8_t> sets;
    bool has_sequence_set = false;
    bool has_picture_set = false;
    for (std::size_t begin = AfterStartCode(frame, 0); begin < frame.size();) {
        const Unit unit = UnitAt(codec_, frame[begin]);
        if (unit == Unit::kPicture) {
            break;
        }
        const std::size_t next = AfterStartCode(frame, begin);
        if (unit != Unit::kOther) {
            std::size_t end = next == frame.size() ? next : next - 3;
            while (end > begin && frame[end - 1] == 0) {
                --end;  // a longer start code's zeros belong to nobody
            }
            sets.insert(sets.end(), kStartCode.begin(), kStartCode.end());
            sets.insert(sets.end(), frame.begin() + static_cast<std::ptrdiff_t>(begin),
                        frame.begin() + static_cast<std::ptrdiff_t>(end));
            has_sequence_set |= unit == Unit::kSequenceSet;
            has_picture_set |= unit == Unit::kPictureSet;
        }
        begin = next;
    }
    return has_sequence_set && has_picture_set ? sets : std::vector<std::uint8_t>{};
}

}  // namespace lookhaven::media
