// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/camera_status_tracker.h"

#include "standalone/base/clock.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

CameraStatusTracker::CameraStatusTracker(const base::Installation& installation) {
    try {
        for (const maintenance::CameraStatus& status : maintenance::ReadCameraStatus(installation)) {
            if (status.lost_since_s > 0) {
                lost_since_s_.emplace(status.camera, status.lost_since_s);
            }
        }
    } catch (const std::exception& failure) {
        base::LogWarning(std::string("cannot read what the previous recorder reported of cameras: ") + failure.what());
    }
}

std::vector<maintenance::CameraStatus> CameraStatusTracker::Combine(std::map<int, maintenance::CameraStatus> recorded,
                                                                    const std::map<int, CameraSignal>& signals) {
    for (const auto& [camera, signal] : signals) {
        maintenance::CameraStatus& status = recorded[camera];
        status.camera = camera;
        status.camera_name = signal.camera_name;
        if (signal.stream.codec) {
            lost_since_s_.erase(camera);
        } else if (!signal.stream.reason.empty()) {
            status.lost_since_s = lost_since_s_.try_emplace(camera, base::WallSeconds()).first->second;
            status.loss = signal.stream.loss;
            status.loss_reason = signal.stream.reason;
            if (status.state == maintenance::RecordingState::kReady) {
                status.state = maintenance::RecordingState::kNoSignal;
            }
        }
    }
    std::vector<maintenance::CameraStatus> list;
    list.reserve(recorded.size());
    for (const auto& [camera, status] : recorded) {
        list.push_back(status);
    }
    return list;
}

}  // namespace lookhaven::recorder
