// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/recovery.h"

#include <optional>
#include <string>

#include "standalone/base/log.h"
#include "standalone/maintenance/retention.h"
#include "standalone/maintenance/salvage.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::int64_t kDayS = 86'400;

// Trouble with one file must not keep the others from being recovered.
template <class Work>
void LogOutcome(Work&& work) {
    try {
        if (const std::string done = work(); !done.empty()) {
            base::LogInfo(done);
        }
    } catch (const store::StoreError&) {
        throw;
    } catch (const std::exception& failure) {
        base::LogWarning(std::string("cannot recover a recording: ") + failure.what());
    }
}

void AdoptRecent(store::Events& events, const MountFolder& mount, int mount_id, int first_own_id, std::int64_t now_s) {
    for (const MountFolder::File& file : mount.Files(now_s - kDayS)) {
        if (file.name.kind == archive::FileKind::kRecording && file.name.event < first_own_id &&
            !events.Find(file.name.event)) {
            LogOutcome([&] { return AdoptRecording(events, mount, mount_id, file.name, first_own_id); });
        }
    }
}

}  // namespace

bool Recover(store::Store& store, const store::Mount& mount, int first_own_id, std::int64_t now_s) {
    const std::optional<MountFolder> folder = MountFolder::Open(mount.path, mount.id);
    if (!folder) {
        return false;
    }
    FinishRemovals(store, mount, *folder, now_s);
    store::Events events(store);
    for (const store::Event& row : events.Open()) {
        if (row.mount_id == mount.id && row.id < first_own_id && !row.demo) {
            LogOutcome([&] { return CloseEvent(events, *folder, row); });
        }
    }
    AdoptRecent(events, *folder, mount.id, first_own_id, now_s);
    return true;
}

}  // namespace lookhaven::maintenance
