// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/shared_folder.h"

#include <algorithm>
#include <set>
#include <system_error>

#include "standalone/maintenance/host_status.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::maintenance {

namespace {

enum class Folder { kMounted, kAbsent, kFailing };

Folder Find(store::Store& store, const store::Mount& mount) {
    try {
        return OpenMount(store, mount) ? Folder::kMounted : Folder::kAbsent;
    } catch (const std::system_error&) {
        return Folder::kFailing;
    }
}

}  // namespace

bool IsMountedHere(store::Store& store, const store::Mount& mount) {
    return Find(store, mount) == Folder::kMounted;
}

bool IsOnlyOnOtherHosts(const base::Installation& installation, store::Store& store, const store::Mount& mount) {
    if (!mount.IsShared() || Find(store, mount) != Folder::kAbsent) {
        return false;
    }
    const int own_host = installation.HostId();
    const std::set<int> online = OnlineHosts(installation);
    return std::ranges::any_of(store::SharedMounts(store).HostsWith(mount.id),
                               [&](int host) { return host != own_host && online.contains(host); });
}

}  // namespace lookhaven::maintenance
