// SPDX-License-Identifier: Apache-2.0
//
// Reports the state of each camera's recording to the operator: the file "recordings" in the run folder.
//
// Why so        The report must reach the operator while the store is unavailable, too. One line per camera; the file
//               is replaced as a whole when something changes:
//
//                 12 recording 4711 0 Entrance
//                 <camera> <state> <event or 0> <frames dropped since the recorder started> <camera's name>
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
    kDiskFails,  // paused: writing to the mount fails
    kMountGone,  // paused: the mount's folder is missing, or has no marker or another's
    kNoMount,    // there is no mount to record to, or another recorder uses it
    kNoEventId,  // paused: no event ids are left, because the store has been unavailable for long
};

// "ready", "recording", "disk-full", "disk-fails", "mount-gone", "no-mount", "no-number"
const char* NameOf(RecordingState state);

struct RecordingStatus {
    int camera = 0;
    RecordingState state = RecordingState::kReady;
    int event = 0;                     // being recorded, else 0
    std::uint64_t dropped_frames = 0;  // because the disk was too slow
    std::string camera_name;

    bool operator==(const RecordingStatus&) const = default;
};

// Throws std::system_error.
void WriteRecordingStatus(const base::Installation& installation, const std::vector<RecordingStatus>& cameras);

// Empty when no recorder has run yet. A recorder that has ended leaves its last report behind: check
// control::IsRecorderAlive too.
std::vector<RecordingStatus> ReadRecordingStatus(const base::Installation& installation);

}  // namespace lookhaven::maintenance
