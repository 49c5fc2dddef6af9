// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_recovery.h"

#include <optional>
#include <string>

#include "standalone/base/log.h"
#include "standalone/maintenance/deletion.h"
#include "standalone/maintenance/inspection.h"
#include "standalone/maintenance/recording_recovery.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::int64_t kDayS = 86'400;

// What is wrong with one file must not keep the others from being recovered, unless it is the disk that fails. False
// when something was.
template <class Work>
bool Try(Work&& work) {
    try {
        if (const std::string done = work(); !done.empty()) {
            base::LogInfo(done);
        }
        return true;
    } catch (const store::StoreError&) {
        throw;
    } catch (const std::exception& failure) {
        if (IsDiskFailure(failure)) {
            throw;
        }
        base::LogWarning(std::string("cannot recover a recording: ") + failure.what());
        return false;
    }
}

bool ImportRecent(store::Events& events, const MountFolder& mount, int mount_id, int first_reserved_id,
                  std::int64_t now_s) {
    bool is_complete = true;
    for (const MountFolder::File& file : mount.Files(now_s - kDayS)) {
        if (file.name.kind == archive::FileKind::kRecording && file.name.event < first_reserved_id &&
            !IsRowOf(events.Find(file.name.event), file.name)) {
            is_complete &= Try([&] {
                const int new_id = events.NextId();
                return ImportRecording(events, mount, mount_id, file.name, new_id,
                                       std::min(first_reserved_id, new_id + 1));
            });
        }
    }
    return is_complete;
}

}  // namespace

bool Recover(store::Store& store, const store::Mount& mount, int first_reserved_id, std::int64_t now_s) {
    const std::optional<MountFolder> folder = OpenMount(store, mount);
    if (!folder) {
        return false;
    }
    Deletion(store, mount, *folder, now_s).Finish();
    store::Mounts(store).ReserveIds(folder->LastCamera(), 0);
    bool is_complete = true;
    store::Events events(store);
    events.SetMissingOrders(mount.id);
    for (const store::Event& row : events.Open()) {
        if (row.mount_id == mount.id && row.id < first_reserved_id && !row.demo) {
            is_complete &= Try([&] { return CloseEvent(events, *folder, row); });
        }
    }
    return ImportRecent(events, *folder, mount.id, first_reserved_id, now_s) && is_complete;
}

}  // namespace lookhaven::maintenance
