// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/shared_folder.h"

#include <algorithm>
#include <set>
#include <system_error>
#include <vector>

#include "standalone/maintenance/host_status.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::maintenance {

bool IsHere(store::Store& store, const store::Mount& mount) {
    try {
        return OpenMount(store, mount).has_value();
    } catch (const std::system_error&) {
        return false;
    }
}

bool IsOnlyElsewhere(const base::Installation& installation, store::Store& store, const store::Mount& mount) {
    try {
        if (!mount.IsShared() || OpenMount(store, mount)) {
            return false;
        }
    } catch (const std::system_error&) {
        return false;
    }
    const int own_host = installation.HostId();
    const std::set<int> offline = OfflineHosts(installation);
    return std::ranges::any_of(store::SharedMounts(store).HostsWith(mount.id),
                               [&](int host) { return host != own_host && !offline.contains(host); });
}

}  // namespace lookhaven::maintenance
