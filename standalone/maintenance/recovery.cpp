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

// Trouble with one file must not keep the others from being saved.
template <class Work>
void LogDone(Work&& work) {
    try {
        if (const Sentence done = work(); !done.empty()) {
            base::LogInfo(done);
        }
    } catch (const store::StoreError&) {
        throw;
    } catch (const std::exception& failure) {
        base::LogWarning(std::string("cannot tidy up: ") + failure.what());
    }
}

void TakeInRecent(store::Events& events, const MountFolder& mount, int mount_id, int first_own_id, std::int64_t now_s) {
    for (const MountFolder::File& file : mount.Files(now_s - kDayS)) {
        if (file.name.kind == archive::FileKind::kRecording && file.name.event < first_own_id &&
            !events.Find(file.name.event)) {
            LogDone([&] { return AdoptRecording(events, mount, mount_id, file.name, first_own_id); });
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
    std::set<int> away;
    for (const store::Event& row : events.Open()) {
        const auto mount = mounts.find(row.mount_id);
        if (row.id >= first_own_id || row.demo) {
            continue;
        }
        if (mount == mounts.end()) {
            away.insert(row.mount_id);
            continue;
        }
        LogDone([&] { return CloseEvent(events, mount->second, row); });
    }
    for (const int id : away) {
        base::LogWarning("mount " + std::to_string(id) + " is not there; its open events wait for it");
    }
    for (const auto& [id, mount] : mounts) {
        TakeInRecent(events, mount, id, first_own_id, now_s);
    }
}

}  // namespace lookhaven::maintenance
