// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/space_watch.h"

#include <algorithm>

namespace lookhaven::maintenance {

std::int64_t SpaceWatch::Allow(std::int64_t lacking, std::int64_t room, std::int64_t now_us) {
    if (lacking <= 0) {
        *this = SpaceWatch();
        return 0;
    }
    if (HasReturned(room)) {
        NoteReturned();
    }
    if (deleted_ == 0 && !is_held_) {
        return lacking;
    }
    if (now_us < until_us_) {
        return 0;
    }
    is_held_ = true;
    return std::min(lacking, std::max<std::int64_t>(1, 2 * returned_));
}

void SpaceWatch::NoteDeleted(std::int64_t deleted, std::int64_t room_before, std::int64_t room_after,
                             std::int64_t now_us) {
    if (deleted <= 0) {
        return;
    }
    deleted_ = deleted;
    room_ = room_before;
    if (HasReturned(room_after)) {
        NoteReturned();
        return;
    }
    returned_ = 0;
    pause_us_ = std::clamp(2 * pause_us_, kMinPauseUs, kMaxPauseUs);
    until_us_ = now_us + pause_us_;
}

void SpaceWatch::NoteReturned() {
    returned_ = deleted_;
    deleted_ = pause_us_ = until_us_ = 0;
}

}  // namespace lookhaven::maintenance
