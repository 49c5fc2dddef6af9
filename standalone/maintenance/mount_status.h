// SPDX-License-Identifier: Apache-2.0
//
// Reports the state of each mount's maintenance to the operator: the file "mounts" in the run folder, one line per
// mount, replaced as a whole when something changes:
//
//   2 failing cannot remove /srv/cameras/3/2026-03-01/081530-12.mkv: Read-only file system
//   <mount> <state> <reason, or nothing>
#pragma once

#include <string>
#include <vector>

#include "standalone/base/installation.h"

namespace lookhaven::maintenance {

enum class MountState {
    kReady,
    kNotMounted,  // its folder is missing or lacks its marker
    kInUse,       // the recorder of another state folder works on it
    kFailing,     // the reason says why; tried again with growing pauses
    kSpaceHeld,   // what deleted recordings held does not come free, so none are deleted to make room
    kKeptFull,    // kept events alone reach its size limit, so all else is deleted as soon as it is finished
};

const char* NameOf(MountState state);  // "ready", "not-mounted", "in-use", "failing", "space-held", "kept-full"

struct MountStatus {
    int mount = 0;
    MountState state = MountState::kReady;
    std::string reason;

    bool operator==(const MountStatus&) const = default;
};

// Throws std::system_error.
void WriteMountStatus(const base::Installation& installation, const std::vector<MountStatus>& mounts);

// As ReadCameraStatus: a recorder that has ended leaves its last report behind.
std::vector<MountStatus> ReadMountStatus(const base::Installation& installation);

}  // namespace lookhaven::maintenance
