// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/retention.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <optional>
#include <utility>
#include <vector>

#include "standalone/store/events.h"

namespace lookhaven::maintenance {

namespace {

constexpr int kEventsPerBatch = 100;
constexpr std::int64_t kFilesOfEvent = 2;  // with its index
// How many events with dates in the future are skipped at most.
constexpr std::size_t kMaxMisdated = 10'000;

// By the age limit. Both walks below go in the order of recording and stop at the first event that is not, so the limit
// must be the same for all of a mount; one of a camera needs walks of its own.
bool IsExpired(const store::Mount& mount, const store::Event& event, std::int64_t now_s) {
    return mount.max_age_s > 0 && event.end_s <= now_s - mount.max_age_s;
}

class Retention {
  public:
    Retention(store::Store& store, const store::Mount& mount, const MountFolder& folder, const RetentionClock& clock)
        : mount_(mount),
          folder_(folder),
          events_(store),
          deletion_(store, mount, folder, clock.now_s),
          clock_(clock),
          now_s_(clock.now_s),
          has_age_limit_(clock.age_limit == AgeLimit::kApplies && mount.max_age_s > 0) {}

    DeletionResult Run(DiskWatch& watch) {
        deletion_.Finish();
        const DeletionResult finished = deletion_.Result();
        const MountSpace space = folder_.Space();
        const std::int64_t lacking_bytes = LackingBytes(space);
        const std::int64_t lacking_files = LackingFiles(space);
        const Room room = lacking_bytes > 0 || lacking_files > 0 ? MeasureRoom() : Room();
        const std::int64_t allowed_bytes = watch.bytes.Allow(lacking_bytes, room.bytes, clock_.monotonic_us);
        const std::int64_t allowed_files = watch.files.Allow(lacking_files, room.files, clock_.monotonic_us);
        excess_bytes_ = std::max(BytesAboveLimit(), allowed_bytes);
        excess_files_ = allowed_files;
        std::exception_ptr failure;
        try {
            DeleteOldest();
        } catch (...) {
            failure = std::current_exception();  // after what has been deleted was noted
        }
        const Room left = allowed_bytes > 0 || allowed_files > 0 ? MeasureRoom() : Room();
        if (allowed_bytes > 0) {
            watch.bytes.NoteDeleted(deletion_.Result().bytes - finished.bytes, room.bytes, left.bytes,
                                    clock_.monotonic_us);
        }
        if (allowed_files > 0) {
            watch.files.NoteDeleted(kFilesOfEvent * (deletion_.Result().events - finished.events), room.files,
                                    left.files, clock_.monotonic_us);
        }
        if (failure) {
            std::rethrow_exception(failure);
        }
        return deletion_.Result();
    }

  private:
    struct Room {  // as in SpaceWatch
        std::int64_t bytes = 0;
        std::int64_t files = 0;
    };

    Room MeasureRoom() {
        const MountSpace space = folder_.Space();
        const store::MountContent content = events_.Content(mount_.id);
        return {space.free_bytes + content.size_bytes, space.free_files + kFilesOfEvent * content.events};
    }

    void DeleteOldest() {
        // Dated in the future: as old as what was recorded after them.
        std::vector<store::Event> misdated;
        store::Event after;
        for (bool has_more = true; has_more && misdated.size() < kMaxMisdated;) {
            const std::vector<store::Event> oldest = events_.InRecordingOrder(mount_.id, after, kEventsPerBatch);
            std::vector<store::Event> chosen;
            has_more = oldest.size() == kEventsPerBatch;
            for (const store::Event& event : oldest) {
                after = event;
                if (TakeFromExcess(event) || (has_age_limit_ && IsExpired(mount_, event, now_s_))) {
                    std::ranges::move(std::exchange(misdated, {}), std::back_inserter(chosen));
                    chosen.push_back(event);
                } else if (has_age_limit_ && event.end_s > now_s_) {
                    misdated.push_back(event);
                } else {
                    // The limits are the mount's, so no younger event exceeds them either.
                    has_more = false;
                    break;
                }
            }
            deletion_.Delete(chosen);
        }
    }

    std::int64_t BytesAboveLimit() {
        return mount_.max_bytes > 0 ? events_.Content(mount_.id).size_bytes - mount_.max_bytes : 0;
    }

    // How much must be deleted until the disk has its reserve free again.
    static std::int64_t LackingBytes(const MountSpace& space) {
        return space.free_bytes < 2 * space.ReserveBytes() ? 3 * space.ReserveBytes() - space.free_bytes : 0;
    }

    // Tiny files, as of a camera whose format changes all the time, fill a file system before their bytes do.
    std::int64_t LackingFiles(const MountSpace& space) const {
        if (space.free_files >= 2 * space.ReserveFiles()) {
            return 0;
        }
        // Some file systems report none free, whatever they hold.
        return space.free_files == 0 && folder_.TakesAnotherFile() ? 0 : 3 * space.ReserveFiles() - space.free_files;
    }

    // Whether it must go, after all that precede it, for lack of room; counts it either way.
    bool TakeFromExcess(const store::Event& event) {
        const bool is_in_excess = chosen_bytes_ < excess_bytes_ || chosen_files_ < excess_files_;
        chosen_bytes_ += event.size_bytes;
        chosen_files_ += kFilesOfEvent;
        return is_in_excess;
    }

    const store::Mount& mount_;
    const MountFolder& folder_;
    store::Events events_;
    Deletion deletion_;
    const RetentionClock clock_;
    const std::int64_t now_s_;
    const bool has_age_limit_;
    std::int64_t excess_bytes_ = 0;
    std::int64_t chosen_bytes_ = 0;
    std::int64_t excess_files_ = 0;
    std::int64_t chosen_files_ = 0;
};

}  // namespace

RetentionForecast ForecastRetention(store::Store& store, const store::Mount& mount, std::int64_t now_s) {
    store::Events events(store);
    RetentionForecast forecast;
    RetentionForecast misdated;  // in the future: as old as what was recorded after them
    const std::int64_t excess_bytes = mount.max_bytes > 0 ? events.Content(mount.id).size_bytes - mount.max_bytes : 0;
    std::int64_t bytes = 0;
    store::Event after;
    for (;;) {
        const std::vector<store::Event> oldest = events.InRecordingOrder(mount.id, after, kEventsPerBatch);
        for (const store::Event& event : oldest) {
            after = event;
            const bool is_deleted = bytes < excess_bytes || IsExpired(mount, event, now_s);
            const bool may_be_deleted = mount.max_age_s > 0 && event.end_s > now_s;
            if (!is_deleted && !may_be_deleted) {
                return forecast;
            }
            bytes += event.size_bytes;
            misdated = {misdated.events + 1, misdated.bytes + event.size_bytes, std::max(misdated.end_s, event.end_s)};
            if (is_deleted) {
                forecast = {forecast.events + misdated.events, forecast.bytes + misdated.bytes,
                            std::max(forecast.end_s, misdated.end_s)};
                misdated = {};
            }
        }
        if (oldest.size() < kEventsPerBatch) {
            return forecast;
        }
    }
}

DeletionResult EnforceRetention(store::Store& store, const store::Mount& mount, const RetentionClock& clock,
                                DiskWatch& watch) {
    const std::optional<MountFolder> folder = OpenMount(store, mount);
    return folder ? Retention(store, mount, *folder, clock).Run(watch) : DeletionResult{};
}

}  // namespace lookhaven::maintenance
