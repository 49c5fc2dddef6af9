// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/verify.h"

#include <algorithm>
#include <array>
#include <limits>
#include <map>
#include <set>
#include <unordered_map>

#include "standalone/archive/mount_file.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/clock.h"
#include "standalone/maintenance/deletion.h"
#include "standalone/maintenance/inspection.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/recording_recovery.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::maintenance {

namespace {

// A recorder's new file has its index and its row well before it is this old.
constexpr std::int64_t kMinAgeS = 10;

class Verification {
  public:
    Verification(store::Store& store, bool repair, const std::function<void(std::size_t, std::size_t)>& progress,
                 const std::map<int, std::string>& left_alone, int host)
        : store_(store),
          events_(store),
          repair_(repair),
          progress_(progress),
          left_alone_(left_alone),
          host_(host),
          next_id_(repair ? events_.NextId() : std::numeric_limits<int>::max()) {}

    VerifyReport Run() {
        for (const store::Mount& mount : store::Mounts(store_).List()) {
            if (const auto why = left_alone_.find(mount.id); why != left_alone_.end()) {
                if (!why->second.empty()) {
                    report_.faults.push_back(
                        {"mount " + std::to_string(mount.id) + " was left alone: " + why->second, ""});
                }
                continue;
            }
            try {
                CheckMount(mount);
            } catch (const std::system_error& failure) {
                report_.faults.push_back(
                    {"mount " + std::to_string(mount.id) + " was not checked further: " + failure.what(), ""});
            } catch (const store::LeaseLost& failure) {
                report_.faults.push_back({failure.what(), ""});
            }
        }
        return std::move(report_);
    }

  private:
    void CheckMount(const store::Mount& mount) {
        std::vector<store::Event> rows;
        events_.VisitMount(mount.id, [&](const store::Event& event) { rows.push_back(event); });
        std::optional<MountFolder> folder = OpenMount(store_, mount);
        if (!folder) {
            report_.faults.push_back({"mount " + std::to_string(mount.id) + " at " + mount.path +
                                          " is not there, with " + std::to_string(rows.size()) + " events",
                                      ""});
            return;
        }
        if (repair_) {
            Deletion(store_, mount, *folder, base::WallSeconds(), host_).Finish();
        }
        for (std::size_t i = 0; i < rows.size(); ++i) {
            if (!MayBeWrittenElsewhere(mount, rows[i])) {
                Try([&] { CheckRow(*folder, rows[i]); });
            }
            if (progress_) {
                progress_(i + 1, rows.size());
            }
        }
        report_.events += static_cast<std::int64_t>(rows.size());
        CheckMarks(*folder, mount.id);
        CheckFiles(*folder, mount.id, rows);
    }

    template <class Work>
    void Try(Work&& work) {
        try {
            work();
        } catch (const store::StoreError&) {
            throw;
        } catch (const std::exception& failure) {
            if (repair_ && IsDiskFailure(failure)) {
                throw;
            }
            report_.faults.push_back({failure.what(), ""});
        }
    }

    template <class Repair>
    void Report(const std::string& problem, Repair&& repair) {
        report_.faults.push_back({problem, ""});
        if (repair_) {
            report_.faults.back().done = repair();
        }
    }

    // Another host's lock on the file may not be seen here, so whether it still writes cannot be told.
    bool MayBeWrittenElsewhere(const store::Mount& mount, const store::Event& row) {
        return mount.IsShared() && row.recording && row.host_id != host_ && store::Hosts(store_).Find(row.host_id);
    }

    void CheckRow(const MountFolder& mount, const store::Event& row) {
        const std::string path = (mount.Path() / row.path).string();
        const std::optional<archive::FileName> name = archive::ParsePath(row.path);
        if (!name || name->event != row.id || name->kind != archive::FileKind::kRecording) {
            Report("the path of event " + std::to_string(row.id) + " names no recording of its own: " + row.path,
                   [&] { return events_.Remove(std::array{row.id}) > 0 ? "removed the event" : ""; });
            return;
        }
        if (!mount.Has(*name)) {
            // Retention may have removed it meanwhile.
            if (events_.Find(row.id)) {
                Report("event " + std::to_string(row.id) + " has no file: " + path,
                       [&] { return CloseEvent(events_, mount, row); });
            }
            return;
        }
        const Inspection found = Inspect(path);
        report_.frames += found.frames;
        if (found.is_growing) {
            return;
        }
        if (!found.problem.empty()) {
            Report(found.problem, [&] { return Repair(mount, row, found); });
        } else if (row.recording || row.frame_count != found.shown_frames) {
            CheckProgress(mount, row);
        }
    }

    // The recorder may have updated the row since it was read.
    void CheckProgress(const MountFolder& mount, const store::Event& before) {
        const std::optional<store::Event> row = events_.Find(before.id);
        const Inspection found = Inspect(mount.Path() / before.path);
        if (row && !found.is_growing && (row->recording || row->frame_count != found.shown_frames)) {
            Report("the row of event " + std::to_string(row->id) + " does not say what its file holds",
                   [&] { return CloseEvent(events_, mount, *row); });
        }
    }

    std::string Repair(const MountFolder& mount, const store::Event& row, const Inspection& found) {
        if (found.is_damaged_inside) {
            return "";
        }
        if (found.must_rebuild_index) {
            RemoveIndex(mount, *archive::ParsePath(row.path));
        }
        return CloseEvent(events_, mount, row);
    }

    static void RemoveIndex(const MountFolder& mount, archive::FileName name) {
        name.kind = archive::FileKind::kIndex;
        mount.Remove(name);
    }

    void CheckMarks(const MountFolder& mount, int mount_id) {
        for (const store::Mark& mark : store::Marks(store_).OnMount(mount_id)) {
            Try([&] {
                try {
                    archive::ReadSpan(mount.Path() / mark.path);
                } catch (const std::exception& failure) {
                    if (IsDiskFailure(failure)) {
                        throw;
                    }
                    Report("the span of mark " + std::to_string(mark.id) + " cannot be read: " + failure.what(),
                           [&] { return SaveMark(store_, mark) ? "written again" : ""; });
                }
            });
        }
    }

    void CheckFiles(const MountFolder& mount, int mount_id, const std::vector<store::Event>& rows) {
        std::set<std::string> expected;
        for (const store::Event& row : rows) {
            expected.insert(row.path);
        }
        for (const store::Event& row : events_.PendingDeletion(mount_id)) {
            expected.insert(row.path);
        }
        for (const store::Mark& mark : store::Marks(store_).OnMount(mount_id)) {
            expected.insert(mark.path);
        }
        const std::int64_t newest_s = base::WallSeconds() - kMinAgeS;
        std::vector<MountFolder::File> files = mount.Files();
        // Imported in the order of recording, as far as dates tell.
        std::ranges::sort(files, {}, [](const MountFolder::File& file) { return file.name.start_s; });
        if (repair_) {
            store::Mounts(store_).ReserveIds(mount.LastCamera(), 0);
            listed_below_ = events_.NextId();
        }
        for (const MountFolder::File& file : files) {
            if (!expected.contains(archive::PathOf(file.name)) && file.changed_s < newest_s) {
                Try([&] { CheckStray(mount, mount_id, file.name, rows.empty()); });
            }
        }
    }

    void CheckStray(const MountFolder& mount, int mount_id, const archive::FileName& name, bool store_is_empty) {
        const std::string path = (mount.Path() / archive::PathOf(name)).string();
        archive::FileName recording = name;
        recording.kind = archive::FileKind::kRecording;
        switch (name.kind) {
        case archive::FileKind::kRecording:
            if (mount.Has(name) && !HasRow(name) && !Inspect(path).is_growing) {
                CheckStrayRecording(mount, mount_id, name, path);
            }
            break;
        case archive::FileKind::kIndex:
            if (mount.Has(name) && !mount.Has(recording)) {
                Report("there is no recording to the index " + path,
                       [&] { return RemoveStray(mount, name, store_is_empty); });
            }
            break;
        case archive::FileKind::kSpan:
            if (mount.Has(name) && !HasMark(name.event)) {
                Report("no mark has the span " + path, [&] { return RemoveStray(mount, name, store_is_empty); });
            }
            break;
        }
    }

    void CheckStrayRecording(const MountFolder& mount, int mount_id, const archive::FileName& name,
                             const std::string& path) {
        // First: a recorder that takes the lease after this has higher ids.
        int new_id = repair_ ? events_.NextId() : 0;
        const store::LeaseState lease = store::AnyRecorder(store_);
        const bool has_recorder = !lease.holder.empty();
        if (has_recorder && name.event >= lease.first_reserved_id && name.event < listed_below_) {
            report_.faults.push_back(
                {"no event has the file " + path + " yet: the recorder may be about to store one", ""});
            return;
        }
        Report("no event has the file " + path, [&] {
            if (has_recorder && new_id == name.event) {
                new_id = events_.NextId();
            }
            return ImportRecording(events_, mount, mount_id, name, new_id, has_recorder ? listed_below_ : new_id + 1);
        });
    }

    // True for an event that began after the rows were read.
    bool HasRow(const archive::FileName& name) {
        return IsRowOf(events_.Find(name.event), name) ||
               events_.PathPendingDeletion(name.event) == archive::PathOf(name);
    }

    bool HasMark(int id) {
        store::Marks marks(store_);
        return marks.Find(store::MarkKind::kAlert, id) || marks.Find(store::MarkKind::kPos, id);
    }

    // A file with an id that this store never gave out may belong to another store: left alone.
    std::string RemoveStray(const MountFolder& mount, const archive::FileName& name, bool store_is_empty) const {
        if (store_is_empty || name.event > next_id_) {
            return "";
        }
        return mount.Remove(name) ? "removed" : "";
    }

    store::Store& store_;
    store::Events events_;
    const bool repair_;
    const std::function<void(std::size_t, std::size_t)>& progress_;
    const std::map<int, std::string>& left_alone_;
    const int host_;
    const int next_id_;
    // Given out once the mount's files were listed. While the store is out of a recorder's reach, the rows of its
    // finished files wait in its memory: those among them have lower ids, and a file with a higher one is of an earlier
    // store, whatever reserve the recorder gets meanwhile.
    int listed_below_ = std::numeric_limits<int>::max();
    VerifyReport report_;
};

}  // namespace

VerifyReport Verify(store::Store& store, bool repair, const std::function<void(std::size_t, std::size_t)>& progress,
                    const std::map<int, std::string>& left_alone, int host) {
    return Verification(store, repair, progress, left_alone, host).Run();
}

}  // namespace lookhaven::maintenance
