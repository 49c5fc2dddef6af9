// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/mount_claim.h"

#include <algorithm>
#include <optional>
#include <vector>

#include "standalone/cli/console.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/settings.h"

namespace lookhaven::cli {

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
    throw Failure(kDataError, "the folder ", path, " belongs to ",
                  is_ours ? Concat("mount ", found->mount_id) : "another installation of Lookhaven",
                  ": with --take-over this mount gets it, and nothing else may record to it then");
}

void ClaimFolder(store::Store& store, const store::Mount& mount) {
    maintenance::MountFolder::WriteMarker(mount.path, maintenance::MarkerFor(store, mount.id));
    const auto folder = maintenance::OpenMount(store, mount);
    int last_event = 0;
    for (const auto& file : folder ? folder->Files() : std::vector<maintenance::MountFolder::File>()) {
        last_event = std::max(last_event, file.name.event);
    }
    store::Mounts(store).ReserveIds(folder ? folder->LastCamera() : 0, last_event);
}

}  // namespace lookhaven::cli
