// SPDX-License-Identifier: Apache-2.0
//
// What the recorder says of each camera's recording, for the operator: the file "recordings" in the run folder.
//
// Why so        It must be told while the store is away, too. One line a camera, replaced as a whole when something
//               changes:
//
//                 12 recording 4711 0 Entrance
//                 <camera> <state> <event or 0> <frames lost since the recorder began> <camera's name>
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "standalone/base/installation.h"

namespace lookhaven::maintenance {

enum class RecordingState {
    kReady,      // nothing to record now, or no picture comes
    kRecording,  // frames go to the disk
    kDiskFull,   // paused until retention or the operator has made room
    kDiskFails,  // paused: the mount does not take what is written
    kMountGone,  // paused: the mount's folder is not there or is not the mount's
    kNoMount,    // there is no mount to record to: lookhaven mount add
    kNoNumber,   // paused: the store has been away for so long that there is no number left for an event
};

// "ready", "recording", "disk-full", "disk-fails", "mount-gone", "no-mount", "no-number"
const char* NameOf(RecordingState state);

struct CameraRecordingState {
    int camera = 0;
    RecordingState state = RecordingState::kReady;
    int event = 0;                  // being recorded, else 0
    std::uint64_t lost_frames = 0;  // left out because the disk did not follow
    std::string camera_name;

    bool operator==(const CameraRecordingState&) const = default;
};

// Throws std::system_error.
void WriteRecordingStates(const base::Installation& installation, const std::vector<CameraRecordingState>& states);

// Empty when no recorder has run. A recorder that is gone leaves its last word: ask control::IsRecorderAlive too.
std::vector<CameraRecordingState> ReadRecordingStates(const base::Installation& installation);

}  // namespace lookhaven::maintenance
