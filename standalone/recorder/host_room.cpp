// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/host_room.h"

#include <algorithm>

namespace lookhaven::recorder {

store::HostRoom RoomOf(const std::vector<maintenance::MountStatus>& mounts,
                       const std::map<int, maintenance::CameraStatus>& cameras) {
    using maintenance::MountState;
    using maintenance::RecordingState;
    const auto has_camera = [&cameras](RecordingState state) {
        return std::ranges::any_of(cameras, [state](const auto& camera) { return camera.second.state == state; });
    };
    const auto has_mount = [&mounts](MountState state) {
        return std::ranges::find(mounts, state, &maintenance::MountStatus::state) != mounts.end();
    };
    if (has_mount(MountState::kReady)) {
        return has_camera(RecordingState::kDiskFull) ? store::HostRoom::kFull : store::HostRoom::kFree;
    }
    // Maintenance also fails where one file cannot be deleted. Cameras need not leave a mount that they record to.
    return has_mount(MountState::kSpaceHeld) || has_mount(MountState::kKeptFull) ||
                   (has_mount(MountState::kFailing) && has_camera(RecordingState::kRecording))
               ? store::HostRoom::kFull
               : store::HostRoom::kNone;
}

}  // namespace lookhaven::recorder
