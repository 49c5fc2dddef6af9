// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/recovery.h"

#include <map>
#include <set>
#include <string>

#include "standalone/base/log.h"
#include "standalone/maintenance/salvage.h"
#include "standalone/store/mounts.h"

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

void Recover(store::Store& store, int first_own_id, std::int64_t now_s) {
    store::Events events(store);
    std::map<int, MountFolder> mounts;
    for (const store::Mount& mount : store::Mounts(store).List()) {
        if (std::optional<MountFolder> folder = MountFolder::Open(mount.path, mount.id)) {
            mounts.emplace(mount.id, std::move(*folder));
        }
    }
    std::set<int> unmounted;
    for (const store::Event& row : events.Open()) {
        const auto mount = mounts.find(row.mount_id);
        if (row.id >= first_own_id || row.demo) {
            continue;
        }
        if (mount == mounts.end()) {
            unmounted.insert(row.mount_id);
            continue;
        }
        LogOutcome([&] { return CloseEvent(events, mount->second, row); });
    }
    for (const int id : unmounted) {
        base::LogWarning("mount " + std::to_string(id) + " is not mounted; its open events are closed once it is");
    }
    for (const auto& [id, mount] : mounts) {
        AdoptRecent(events, mount, id, first_own_id, now_s);
    }
}

}  // namespace lookhaven::maintenance
