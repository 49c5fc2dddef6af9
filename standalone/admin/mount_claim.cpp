// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/mount_claim.h"

#include <algorithm>
#include <filesystem>
#include <optional>
#include <vector>

#include <unistd.h>

#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/settings.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::admin {

std::string RequireFolder(const std::string& path) {
    std::error_code error;
    const std::filesystem::path folder = std::filesystem::canonical(path, error);
    if (error || !std::filesystem::is_directory(folder, error)) {
        throw UnusableFolder(UnusableFolder::Reason::kAbsent,
                             "there is no folder " + path + ": create it, or mount its disk, first");
    }
    if (::access(folder.c_str(), R_OK | W_OK | X_OK) != 0) {
        throw UnusableFolder(UnusableFolder::Reason::kNoAccess,
                             "you have no write access to the folder " + path + ": the server needs it");
    }
    return folder.string();
}

void RequireFreeFolder(store::Store& store, const std::string& path, int mount_id, bool take_over) {
    const std::optional<maintenance::MountMarker> found = maintenance::MountFolder::ReadMarker(path);
    if (!found || take_over) {
        return;
    }
    const bool is_ours = found->installation == store::Settings(store).Installation();
    const bool is_early = found->installation.empty() && found->mount_id == mount_id;
    if (is_early || (is_ours && (found->mount_id == mount_id || !store::Mounts(store).Find(found->mount_id)))) {
        return;
    }
    throw UnusableFolder(
        UnusableFolder::Reason::kTaken,
        "the folder " + path + " belongs to " +
            (is_ours ? "mount " + std::to_string(found->mount_id) : "another installation of Lookhaven") +
            ": with --take-over this mount gets it, and nothing else may record to it then");
}

void RequireSharedFolder(store::Store& store, const store::Mount& mount, int own_host) {
    const std::vector<int> hosts = store::SharedMounts(store).HostsWith(mount.id);
    const bool is_elsewhere = std::ranges::any_of(hosts, [own_host](int host) { return host != own_host; });
    if (mount.IsShared() && is_elsewhere && !maintenance::OpenMount(store, mount)) {
        throw UnusableFolder(UnusableFolder::Reason::kAbsent, "the folder " + mount.path +
                                                                  " is not marked as the shared mount \"" + mount.name +
                                                                  "\", which other hosts have: mount it there first");
    }
}

void MarkFolder(store::Store& store, const store::Mount& mount) {
    maintenance::MountFolder::WriteMarker(mount.path, maintenance::MarkerFor(store, mount.id));
}

void ReserveIds(store::Store& store, const store::Mount& mount) {
    const auto folder = maintenance::OpenMount(store, mount);
    int last_event = 0;
    for (const auto& file : folder ? folder->Files() : std::vector<maintenance::MountFolder::File>()) {
        last_event = std::max(last_event, file.name.event);
    }
    store::Mounts(store).ReserveIds(folder ? folder->LastCamera() : 0, last_event);
}

}  // namespace lookhaven::admin
