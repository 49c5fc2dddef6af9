// SPDX-License-Identifier: Apache-2.0
//
// Combines what the recorder reports of each camera: the state of its recording, and since when it has sent nothing.
//
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/recorder/stream_worker.h"

namespace lookhaven::recorder {

// What a camera sends: by the stream that is recorded, else by one that fails, if any does.
struct CameraSignal {
    std::string camera_name;
    bool is_recorded = false;
    StreamSignal stream;
    std::uint64_t bytes = 0;  // received since the stream was started
};

class CameraStatusTracker {
  public:
    // Begins with the cameras that sent nothing when the previous recorder of this installation ended.
    explicit CameraStatusTracker(const base::Installation& installation);

    // recorded: the states of the recordings, by camera; signals: of the cameras that are connected to, recorded or not.
    std::vector<maintenance::CameraStatus> Combine(std::map<int, maintenance::CameraStatus> recorded,
                                                   const std::map<int, CameraSignal>& signals);

  private:
    std::map<int, std::int64_t> lost_since_s_;  // by camera
};

}  // namespace lookhaven::recorder
