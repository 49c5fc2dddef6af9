// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/frame_assembler.h"

#include <algorithm>
#include <utility>

#include "standalone/media/annexb.h"

namespace lookhaven::media {

std::optional<FrameAssembler::Frame> FrameAssembler::Add(std::span<const std::uint8_t> piece, std::int64_t time_us) {
    std::optional<Frame> frame;
    const bool may_begin = MayBeginPicture(codec_, piece);
    if (pending_.empty() && !may_begin) {
        return frame;  // the rest of a picture whose beginning did not arrive
    }
    if (may_begin && time_us != pending_time_us_) {
        if (std::exchange(has_picture_, false)) {
            whole_ = std::exchange(pending_, {});
            if (whole_.size() <= base::kMaxFrameBytes) {
                frame = Frame{whole_, pending_time_us_};
            }
        }
        pending_time_us_ = time_us;
    }
    has_picture_ = has_picture_ || HasPicture(codec_, piece);
    // At most one byte too many is kept, which marks the picture as too large.
    const std::size_t room = base::kMaxFrameBytes + 1 - pending_.size();
    const auto taken = piece.first(std::min(room, piece.size()));
    pending_.insert(pending_.end(), taken.begin(), taken.end());
    return frame;
}

}  // namespace lookhaven::media
