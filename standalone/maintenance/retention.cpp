// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/retention.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <optional>
#include <span>
#include <system_error>
#include <utility>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/events.h"

namespace lookhaven::maintenance {

namespace {

constexpr int kEventsPerBatch = 100;
constexpr std::int64_t kFilesOfEvent = 2;  // with its index
// How many events with dates in the future are skipped at most.
constexpr std::size_t kMaxMisdated = 10'000;

enum class Verdict { kGoes, kGoesWithNext, kStays };

// By that age limit; 0: none. What is dated in the future is as old as what was recorded after it.
Verdict ByAge(const store::Event& event, std::int64_t max_age_s, std::int64_t now_s) {
    return max_age_s == 0                     ? Verdict::kStays
           : event.end_s <= now_s - max_age_s ? Verdict::kGoes
           : event.end_s > now_s              ? Verdict::kGoesWithNext
                                              : Verdict::kStays;
}

// Hands over what goes, page by page in the order of recording, up to the first event that stays: the limits are those
// of all events that next_page returns, so no younger one exceeds them either.
template <typename NextPage, typename Judge, typename Take>
void TakeOldest(NextPage next_page, Judge judge, Take take) {
    std::vector<store::Event> undecided;
    store::Event after;
    for (bool has_more = true; has_more && undecided.size() < kMaxMisdated;) {
        const std::vector<store::Event> oldest = next_page(after);
        std::vector<store::Event> chosen;
        has_more = oldest.size() == kEventsPerBatch;
        for (const store::Event& event : oldest) {
            after = event;
            const Verdict verdict = judge(event);
            if (verdict == Verdict::kStays) {
                has_more = false;
                break;
            }
            undecided.push_back(event);
            if (verdict == Verdict::kGoes) {
                std::ranges::move(std::exchange(undecided, {}), std::back_inserter(chosen));
            }
        }
        take(chosen);
    }
}

// Whether what lies there, and not the disk, keeps a file from being removed.
bool IsOfFile(const std::error_code& why) {
    return why == std::errc::permission_denied || why == std::errc::operation_not_permitted ||
           why == std::errc::is_a_directory || why == std::errc::too_many_symbolic_link_levels;
}

// TakeOldest of a mount's events of a camera, by its age limit.
template <typename Take>
void TakeExpired(store::Events& events, int mount_id, int camera_id, std::int64_t max_age_s, std::int64_t now_s,
                 Take take) {
    TakeOldest(
        [&](const store::Event& after) { return events.InRecordingOrder(mount_id, after, kEventsPerBatch, camera_id); },
        [&](const store::Event& event) { return ByAge(event, max_age_s, now_s); }, take);
}

class Retention {
  public:
    Retention(store::Store& store, const store::Mount& mount, const MountFolder& folder, const RetentionClock& clock,
              int host)
        : mount_(mount),
          folder_(folder),
          cameras_(store),
          events_(store),
          deletion_(store, mount, folder, clock.now_s, host),
          clock_(clock),
          now_s_(clock.now_s),
          applies_age_(clock.age_limit == AgeLimit::kApplies) {}

    void Run(DiskWatch& watch) {
        deletion_.Finish();
        if (applies_age_) {
            DeleteExpiredOfCameras();
        }
        const DeletionResult finished = deletion_.Result();
        const MountSpace space = folder_.Space();
        const std::int64_t lacking_bytes = LackingBytes(space);
        const std::int64_t lacking_files = LackingFiles(space);
        const Room room = lacking_bytes > 0 || lacking_files > 0 ? MeasureRoom() : Room();
        const std::int64_t allowed_bytes = watch.bytes.Allow(lacking_bytes, room.bytes, clock_.monotonic_us);
        const std::int64_t allowed_files = watch.files.Allow(lacking_files, room.files, clock_.monotonic_us);
        excess_bytes_ = std::max(BytesAboveLimit(), allowed_bytes);
        excess_files_ = allowed_files;
        try {
            DeleteOldest();
        } catch (...) {
            failure_ = std::current_exception();  // after what has been deleted was noted
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
        if (failure_) {
            std::rethrow_exception(failure_);
        }
    }

    const DeletionResult& Deleted() const { return deletion_.Result(); }

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

    // A file that cannot be removed is one camera's: all others keep to their ages, and the mount to its limits. A disk
    // that fails ends the run.
    void DeleteExpiredOfCameras() {
        for (const auto& [camera, max_age_s] : cameras_.MaxAges()) {
            try {
                TakeExpired(events_, mount_.id, camera, max_age_s, now_s_,
                            [this](std::span<const store::Event> events) { deletion_.Delete(events); });
            } catch (const std::system_error& error) {
                if (!IsOfFile(error.code())) {
                    throw;
                }
                failure_ = std::current_exception();
            }
        }
    }

    void DeleteOldest() {
        TakeOldest(
            [this](const store::Event& after) { return events_.InRecordingOrder(mount_.id, after, kEventsPerBatch); },
            [this](const store::Event& event) {
                return TakeFromExcess(event) ? Verdict::kGoes
                                             : ByAge(event, applies_age_ ? mount_.max_age_s : 0, now_s_);
            },
            [this](std::span<const store::Event> events) { deletion_.Delete(events); });
    }

    std::int64_t BytesAboveLimit() {
        return mount_.max_bytes > 0 ? events_.Content(mount_.id).size_bytes - mount_.max_bytes : 0;
    }

    // How much must be deleted until the disk has its reserve free again.
    static std::int64_t LackingBytes(const MountSpace& space) {
        return space.IsShort() ? 3 * space.ReserveBytes() - space.free_bytes : 0;
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
    store::Cameras cameras_;
    store::Events events_;
    Deletion deletion_;
    const RetentionClock clock_;
    const std::int64_t now_s_;
    const bool applies_age_;
    std::exception_ptr failure_;  // the last one of this mount
    std::int64_t excess_bytes_ = 0;
    std::int64_t chosen_bytes_ = 0;
    std::int64_t excess_files_ = 0;
    std::int64_t chosen_files_ = 0;
};

void AddTo(RetentionForecast& forecast, std::span<const store::Event> events) {
    for (const store::Event& event : events) {
        ++forecast.events;
        forecast.bytes += event.size_bytes;
        forecast.end_s = std::max(forecast.end_s, event.end_s);
    }
}

}  // namespace

RetentionForecast ForecastRetention(store::Store& store, const store::Mount& mount, std::int64_t now_s) {
    store::Events events(store);
    const std::int64_t excess_bytes = mount.max_bytes > 0 ? events.Content(mount.id).size_bytes - mount.max_bytes : 0;
    std::int64_t bytes = 0;
    RetentionForecast forecast;
    TakeOldest([&](const store::Event& after) { return events.InRecordingOrder(mount.id, after, kEventsPerBatch); },
               [&](const store::Event& event) {
                   const bool is_in_excess = bytes < excess_bytes;
                   bytes += event.size_bytes;
                   return is_in_excess ? Verdict::kGoes : ByAge(event, mount.max_age_s, now_s);
               },
               [&](std::span<const store::Event> page) { AddTo(forecast, page); });
    return forecast;
}

RetentionForecast ForecastRetention(store::Store& store, int camera_id, std::int64_t max_age_s, std::int64_t now_s) {
    store::Events events(store);
    RetentionForecast forecast;
    for (const store::Mount& mount : store::Mounts(store).List()) {
        TakeExpired(events, mount.id, camera_id, max_age_s, now_s,
                    [&](std::span<const store::Event> page) { AddTo(forecast, page); });
    }
    return forecast;
}

void EnforceRetention(store::Store& store, const store::Mount& mount, const RetentionClock& clock, int host,
                      DiskWatch& watch, DeletionResult& deleted) {
    const std::optional<MountFolder> folder = OpenMount(store, mount);
    if (!folder) {
        return;
    }
    Retention retention(store, mount, *folder, clock, host);
    try {
        retention.Run(watch);
    } catch (...) {
        deleted = retention.Deleted();
        throw;
    }
    deleted = retention.Deleted();
}

}  // namespace lookhaven::maintenance
