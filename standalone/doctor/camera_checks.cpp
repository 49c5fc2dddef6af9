// SPDX-License-Identifier: Apache-2.0
//
// Cameras: whether they send pictures, whether these are recorded, and the shared memory that they pass through.
#include <algorithm>
#include <exception>
#include <map>

#include "standalone/base/amounts.h"
#include "standalone/base/concat.h"
#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/media/source_kinds.h"
#include "standalone/ring/inventory.h"
#include "standalone/store/cameras.h"
#include "standalone/store/value_names.h"

namespace lookhaven::doctor {

namespace {

using base::Concat;
using base::FormatMoment;
using base::SignalLoss;
using maintenance::CameraStatus;
using maintenance::RecordingState;

std::string TitleOf(const CameraStatus& status) {
    return Concat("camera ", status.camera, " (", status.camera_name, ")");
}

// By camera, the option for the address of the profile that the live view shows; of those where it is not --source.
std::map<int, std::string> LiveSourceOptions(const base::Installation& installation) {
    std::map<int, std::string> options;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        for (const store::Camera& camera : store::Cameras(store).List()) {
            for (const auto& [name, number] : store::ProfileNames()) {
                if (number == camera.live_profile && number != 0) {
                    options.emplace(camera.id, "--" + name + "-source");
                }
            }
        }
    } catch (const std::exception&) {
        // CheckStore reports it
    }
    return options;
}

std::string RemedyOf(const CameraStatus& status, const std::string& source_option) {
    switch (status.loss) {
    case SignalLoss::kWrongPassword:
        return Concat("lookhaven camera set ", status.camera, " --account ACCOUNT");
    case SignalLoss::kCertificate:
        return Concat("have an authority that this machine trusts sign it, or: lookhaven camera set ", status.camera,
                      " --insecure");
    case SignalLoss::kRefused:
    case SignalLoss::kUnknownHost:
    case SignalLoss::kUnreachable:
        return Concat("switch the camera on, or, if its address or port has changed: lookhaven camera set ",
                      status.camera, " ", source_option, " ADDRESS");
    default:
        return Concat("restart the camera, and see what it sends: lookhaven camera probe ", status.camera);
    }
}

Finding NoSignal(const CameraStatus& status, const std::map<int, std::string>& source_options) {
    const auto option = source_options.find(status.camera);
    return {Concat(TitleOf(status), " has sent no picture since ", FormatMoment(status.lost_since_s), ": ",
                   base::NameOf(status.loss), " (", status.loss_reason, ")"),
            RemedyOf(status, option == source_options.end() ? "--source" : option->second)};
}

bool IsPaused(RecordingState state) {
    return state != RecordingState::kReady && state != RecordingState::kRecording && state != RecordingState::kNoSignal;
}

const char* RemedyOfPause(RecordingState state) {
    switch (state) {
    case RecordingState::kNoEventId:
        return "repair the store, which assigns event ids";
    case RecordingState::kDiskFull:
        return "free space on its mount's disk, or lower the mount's limit with lookhaven mount set";
    case RecordingState::kDiskFails:
        return "look for errors of its mount's disk in the kernel's messages (dmesg), and replace the disk if there "
               "are any";
    default:
        return "check that its mount is enabled and in its place with lookhaven mount list";
    }
}

}  // namespace

// A camera with an address of HTTPS whose certificate may be anybody's.
Findings CheckCameras(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        for (const store::Camera& camera : store::Cameras(store).List()) {
            if (camera.insecure && std::ranges::any_of(camera.profiles, [](const store::CameraProfile& profile) {
                    const media::NetworkKind* kind = media::FindNetworkKind(profile.source);
                    return kind != nullptr && kind->has_tls;
                })) {
                findings.push_back(
                    {Concat("the HTTPS certificate of camera ", camera.id, " is not verified"),
                     Concat("once an authority that this machine trusts has signed it: lookhaven camera set ",
                            camera.id, " --secure"),
                     Severity::kNote});
            }
        }
    } catch (const std::exception&) {
        return {};  // CheckStore reports it
    }
    return findings;
}

// What the recorder reports of each camera.
Findings CheckRecordings(const base::Installation& installation) {
    if (control::FindRecorder(installation) != control::RecorderState::kAlive) {
        return {};  // stale
    }
    Findings findings;
    const std::vector<CameraStatus> cameras = maintenance::ReadCameraStatus(installation);
    const bool is_one_down = std::ranges::any_of(cameras, [](const auto& status) { return status.lost_since_s > 0; });
    const auto source_options = is_one_down ? LiveSourceOptions(installation) : std::map<int, std::string>();
    for (const CameraStatus& status : cameras) {
        if (status.lost_since_s > 0) {
            findings.push_back(NoSignal(status, source_options));
        }
        if (IsPaused(status.state)) {
            findings.push_back({Concat(TitleOf(status), " is not recorded: ", maintenance::NameOf(status.state)),
                                Concat(RemedyOfPause(status.state), "; recording then resumes by itself")});
        }
    }
    return findings;
}

Findings CheckSegments(const base::Installation& installation) {
    Findings findings;
    for (const ring::SegmentState& segment : ring::ListSegments(installation)) {
        const std::string name = Concat("the shared memory ", segment.shm_id, " of camera ", segment.id.camera);
        if (!segment.has_known_layout) {
            findings.push_back({name + " was created by another version",
                                Concat("restart the server; if it stays: ipcrm -m ", segment.shm_id)});
        } else if (!segment.writer_alive && segment.attached == 0) {
            findings.push_back({name + " was left behind", "start the recorder, which reuses or removes it"});
        }
    }
    return findings;
}

}  // namespace lookhaven::doctor
