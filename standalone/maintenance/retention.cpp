// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/retention.h"

#include <algorithm>
#include <exception>
#include <map>
#include <span>
#include <utility>
#include <vector>

#include "standalone/archive/recording_log.h"
#include "standalone/base/log.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"

namespace lookhaven::maintenance {

namespace {

constexpr int kEventsAtOnce = 100;
constexpr int kMarksAtOnce = 100;
constexpr std::int64_t kFilesOfEvent = 2;  // with its index
// So many events with dates in the future are looked past.
constexpr std::size_t kMaxMisdated = 10'000;

std::vector<int> IdsOf(std::span<const store::Event> events) {
    std::vector<int> ids;
    for (const store::Event& event : events) {
        ids.push_back(event.id);
    }
    return ids;
}

bool IsOlderThanLimit(const store::Mount& mount, const store::Event& event, std::int64_t now_s) {
    return mount.max_age_s > 0 && event.end_s <= now_s - mount.max_age_s;
}

class Retention {
  public:
    Retention(store::Store& store, const store::Mount& mount, const MountFolder& folder, const RetentionClock& clock)
        : store_(store),
          mount_(mount),
          folder_(folder),
          events_(store),
          marks_(store),
          mounts_(store),
          clock_(clock),
          now_s_(clock.now_s),
          has_age_limit_(clock.age_limit == AgeLimit::kApplies && mount.max_age_s > 0) {}

    RetentionResult Run(DiskWatch& watch) {
        FinishDeletions();
        const RetentionResult finished = deleted_;
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
            watch.bytes.NoteDeleted(deleted_.bytes - finished.bytes, room.bytes, left.bytes, clock_.monotonic_us);
        }
        if (allowed_files > 0) {
            watch.files.NoteDeleted(kFilesOfEvent * (deleted_.events - finished.events), room.files, left.files,
                                    clock_.monotonic_us);
        }
        if (failure) {
            std::rethrow_exception(failure);
        }
        return deleted_;
    }

    // The rows pending deletion: those of this pass, and those that a crash left.
    void FinishDeletions() {
        std::vector<store::Event> pending = events_.PendingDeletion(mount_.id);
        std::exception_ptr failure;
        for (auto event = pending.begin(); event != pending.end(); ++event) {
            try {
                RemoveFile(*event);
            } catch (const std::system_error&) {
                failure = std::current_exception();
                events_.CancelDeletion(IdsOf({event, pending.end()}));
                pending.erase(event, pending.end());
                break;
            }
        }
        std::map<int, std::int64_t> ends_s;  // of what each camera has lost
        for (const store::Event& event : pending) {
            ++deleted_.events;
            deleted_.bytes += event.size_bytes;
            // What a wrong clock dated ahead says nothing about the marks before it.
            if (event.end_s <= now_s_) {
                ends_s[event.camera_id] = std::max(ends_s[event.camera_id], event.end_s);
            }
            ClearRecordingLog(event);
        }
        for (const auto& [camera, end_s] : ends_s) {
            RemoveMarks(camera, end_s);
        }
        for (const store::Event& event : pending) {
            if (archive::DayOf(event.start_s) != archive::DayOf(now_s_)) {
                folder_.RemoveDayIfEmpty(event.camera_id, event.start_s);
            }
        }
        events_.FinishDeletion(IdsOf(pending));
        if (failure) {
            std::rethrow_exception(failure);
        }
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
            const std::vector<store::Event> oldest = events_.InRecordingOrder(mount_.id, after, kEventsAtOnce);
            std::vector<store::Event> chosen;
            has_more = oldest.size() == kEventsAtOnce;
            for (const store::Event& event : oldest) {
                after = event;
                if (IsInExcess(event) || IsExpired(event)) {
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
            Delete(chosen);
        }
    }

    std::int64_t BytesAboveLimit() {
        return mount_.max_bytes > 0 ? events_.Content(mount_.id).size_bytes - mount_.max_bytes : 0;
    }

    // Of what the disk should have free.
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

    // Of what precedes it, all is in excess.
    bool IsInExcess(const store::Event& event) {
        const bool is_in_excess = chosen_bytes_ < excess_bytes_ || chosen_files_ < excess_files_;
        chosen_bytes_ += event.size_bytes;
        chosen_files_ += kFilesOfEvent;
        return is_in_excess;
    }

    // The age limit. DeleteOldest stops at the first event that is not expired, so the limit must be the same for all
    // of a mount.
    bool IsExpired(const store::Event& event) const {
        return has_age_limit_ && IsOlderThanLimit(mount_, event, now_s_);
    }

    void Delete(std::span<const store::Event> events) {
        if (!events.empty()) {
            events_.BeginDeletion(IdsOf(events));
            FinishDeletions();
        }
    }

    void RemoveFile(const store::Event& event) {
        const std::optional<archive::FileName> name = archive::ParsePath(event.path);
        if (name && name->kind == archive::FileKind::kRecording) {
            folder_.Remove(*name);
        } else {
            base::LogWarning("the path of event " + std::to_string(event.id) + " names no recording: left alone");
        }
    }

    bool HasFootage(int camera, std::int64_t begin_s, std::int64_t end_s) {
        store::EventFilter filter;
        filter.camera_ids = {camera};
        filter.begin_s = begin_s;
        filter.end_s = std::max(end_s, begin_s + 1);
        filter.limit = 1;
        return !events_.List(filter).empty();
    }

    // Those that ended by then and have no footage left, however many before them have some.
    void RemoveMarks(int camera, std::int64_t end_s) {
        std::vector<store::Mark> page;
        store::Mark last;
        do {
            page = marks_.EndedBy(camera, end_s, last, kMarksAtOnce);
            for (const store::Mark& mark : page) {
                last = mark;
                if (!HasFootage(camera, mark.start_s, mark.end_s)) {
                    RemoveMark(mark);
                }
            }
        } while (page.size() == kMarksAtOnce);
    }

    void RemoveMark(const store::Mark& mark) {
        try {
            if (RemoveSpan(mark)) {
                marks_.Remove(mark.id);
                ++deleted_.marks;
            }
        } catch (const std::system_error& failure) {  // its file may lie on another mount
            base::LogWarning("mark " + std::to_string(mark.id) + " stays: " + failure.what());
        }
    }

    // False while the mount that holds the span file is not mounted. Here the row is removed after the file: without
    // footage the mark has nothing to show either way.
    bool RemoveSpan(const store::Mark& mark) {
        const std::optional<archive::FileName> name = archive::ParsePath(mark.path);
        if (mark.state != store::MarkState::kSaved || !name || name->kind != archive::FileKind::kSpan) {
            return true;
        }
        if (mark.mount_id == mount_.id) {
            folder_.Remove(*name);
            return true;
        }
        const std::optional<store::Mount> other = mounts_.Find(mark.mount_id);
        const std::optional<MountFolder> folder = other ? OpenMount(store_, *other) : std::optional<MountFolder>();
        if (folder) {
            folder->Remove(*name);
        }
        return folder.has_value();
    }

    // The recording log says what can be played: seconds that other events share stay.
    void ClearRecordingLog(const store::Event& event) {
        const std::filesystem::path camera = folder_.Path() / std::to_string(event.camera_id);
        std::int64_t end_s = event.end_s;
        while (end_s > event.start_s && HasFootage(event.camera_id, end_s - 1, end_s)) {
            --end_s;
        }
        std::int64_t begin_s = event.start_s;
        while (begin_s < end_s && HasFootage(event.camera_id, begin_s, begin_s + 1)) {
            ++begin_s;
        }
        if (begin_s >= end_s || !folder_.HasDay(event.camera_id, begin_s)) {
            return;
        }
        try {
            archive::WriteRecordingLog(camera, begin_s, end_s, 0);
        } catch (const std::system_error& failure) {
            base::LogWarning(std::string("the recording log still shows deleted footage: ") + failure.what());
        }
    }

    store::Store& store_;
    const store::Mount& mount_;
    const MountFolder& folder_;
    store::Events events_;
    store::Marks marks_;
    store::Mounts mounts_;
    const RetentionClock clock_;
    const std::int64_t now_s_;
    const bool has_age_limit_;
    std::int64_t excess_bytes_ = 0;
    std::int64_t chosen_bytes_ = 0;
    std::int64_t excess_files_ = 0;
    std::int64_t chosen_files_ = 0;
    RetentionResult deleted_;
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
        const std::vector<store::Event> oldest = events.InRecordingOrder(mount.id, after, kEventsAtOnce);
        for (const store::Event& event : oldest) {
            after = event;
            const bool is_deleted = bytes < excess_bytes || IsOlderThanLimit(mount, event, now_s);
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
        if (oldest.size() < kEventsAtOnce) {
            return forecast;
        }
    }
}

RetentionResult EnforceRetention(store::Store& store, const store::Mount& mount, const RetentionClock& clock,
                                 DiskWatch& watch) {
    const std::optional<MountFolder> folder = OpenMount(store, mount);
    return folder ? Retention(store, mount, *folder, clock).Run(watch) : RetentionResult{};
}

void FinishDeletions(store::Store& store, const store::Mount& mount, const MountFolder& folder, std::int64_t now_s) {
    Retention(store, mount, folder, {.now_s = now_s}).FinishDeletions();
}

}  // namespace lookhaven::maintenance
