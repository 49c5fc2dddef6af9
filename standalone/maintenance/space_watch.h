// SPDX-License-Identifier: Apache-2.0
//
// Tells whether deleting recordings gives a disk its space back.
//
// Why so        What a snapshot or a copy that shares its blocks holds (btrfs, ZFS, XFS) stays in use when the file is
//               gone. Deleting until the disk has room would then delete everything and gain nothing.
// Invariants    While space does not come back, no more is deleted for lack of it than was needed once, and a little at
//               each attempt after that. What else there is to delete, for age or a limit, is not this class's matter.
// Thread safety One thread.
#pragma once

#include <cstdint>

namespace lookhaven::maintenance {

// Watches one resource, bytes or files. Its room is the sum of what is free and what recordings hold, which recording
// and deleting do not change, unless deleted files keep their space.
class SpaceWatch {
  public:
    // Some file systems need half a minute to free what was deleted.
    static constexpr std::int64_t kMinPauseUs = 60'000'000;
    static constexpr std::int64_t kMaxPauseUs = 3'600'000'000;

    // is_held: what IsHeld() of the previous watch returned.
    explicit SpaceWatch(bool is_held = false) : is_held_(is_held) {}

    // How much of what is lacking may be deleted now; 0 or less is lacking when the disk has room. After a pause one
    // recording is tried: 1 is returned. If its space came back, twice the amount last returned is allowed next, since
    // another program may have freed it.
    std::int64_t Allow(std::int64_t lacking, std::int64_t room, std::int64_t now_us);
    // After deleting what Allow permitted, with the room before and after.
    void NoteDeleted(std::int64_t deleted, std::int64_t room_before, std::int64_t room_after, std::int64_t now_us);

    // Whether Allow returns 0 now, since what was deleted last has not come back.
    bool IsPaused(std::int64_t now_us) const { return now_us < until_us_; }

    // Deleting freed no space, and a whole pause has passed since. True until nothing is lacking.
    bool IsHeld() const { return is_held_; }

  private:
    void NoteReturned();
    bool HasReturned(std::int64_t room) const { return deleted_ > 0 && room_ - room <= deleted_ / 2; }

    std::int64_t deleted_ = 0;   // last, while it has not come back
    std::int64_t room_ = 0;      // before that
    std::int64_t returned_ = 0;  // what was deleted last, when it has come back
    std::int64_t pause_us_ = 0;
    std::int64_t until_us_ = 0;
    bool is_held_;
};

}  // namespace lookhaven::maintenance
