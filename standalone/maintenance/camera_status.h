// SPDX-License-Identifier: Apache-2.0
//
// Reports to the operator the state of each camera that is recorded or watched: the file "recordings" in the run
// folder.
//
// Why so        The report must reach the operator while the store is unavailable, too. One line per camera; the file
//               is replaced as a whole when something changes:
//
//                 12 recording 4711 0 0 other Entrance
//                 13 no-signal 0 0 1772352930 refused Gate<tab>cannot open: Connection refused
//                 <camera> <state> <event or 0> <frames dropped since the recorder started> <since when no picture
//                 comes, UTC seconds, or 0> <why> <camera's name><tab><why, in a sentence>
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/base/signal_loss.h"

namespace lookhaven::maintenance {

enum class RecordingState {
    kReady,      // nothing to record now, or the first picture has not come yet
    kRecording,  // frames go to the disk
    kDiskFull,   // paused until retention or the operator has made room
    kDiskFails,  // paused: writing to the mount fails
    kMountGone,  // paused: the mount's folder is missing, or has no marker or another's
    kNoMount,    // there is no mount to record to, or another recorder uses it
    kNoEventId,  // paused: no event ids are left, because the store has been unavailable for long
    kNoSignal,   // no picture comes, whatever is to be recorded
};

// "ready", "recording", "disk-full", "disk-fails", "mount-gone", "no-mount", "no-event-id", "no-signal"
const char* NameOf(RecordingState state);

struct CameraStatus {
    int camera = 0;
    RecordingState state = RecordingState::kReady;
    int event = 0;                     // being recorded, else 0
    std::uint64_t dropped_frames = 0;  // because the disk was too slow
    std::string camera_name = {};
    std::int64_t lost_since_s = 0;  // UTC; when it was first noticed that no picture comes; 0 while pictures come
    base::SignalLoss loss = base::SignalLoss::kOther;
    std::string loss_reason = {};  // one sentence without credentials

    bool operator==(const CameraStatus&) const = default;
};

// Throws std::system_error.
void WriteCameraStatus(const base::Installation& installation, const std::vector<CameraStatus>& cameras);

// Empty when no recorder has run yet. A recorder that has ended leaves its last report behind: check
// control::IsRecorderAlive too.
std::vector<CameraStatus> ReadCameraStatus(const base::Installation& installation);

}  // namespace lookhaven::maintenance
