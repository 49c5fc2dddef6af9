// SPDX-License-Identifier: Apache-2.0
//
// Whether this host can record more cameras, by the states of its mounts and of the cameras that it records.
#pragma once

#include <map>
#include <vector>

#include "standalone/maintenance/camera_status.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/store/hosts.h"

namespace lookhaven::recorder {

// cameras: by id. With kNone the host gives its floating cameras away.
store::HostRoom RoomOf(const std::vector<maintenance::MountStatus>& mounts,
                       const std::map<int, maintenance::CameraStatus>& cameras);

}  // namespace lookhaven::recorder
