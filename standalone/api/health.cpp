// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/health.h"

#include <algorithm>
#include <map>
#include <optional>
#include <set>

#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/control/stream_counters.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/shared_folder.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/cameras.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::api {

namespace {

using Problems = std::vector<Problem>;

constexpr std::int64_t kHourBeginSeconds = 10;

void CheckStreams(const std::vector<control::StreamCounters>& streams, Problems& problems) {
    const std::int64_t now_us = base::MonotonicMicros();
    for (const control::StreamCounters& each : streams) {
        if (now_us - each.last_picture_us > kMaxPictureAgeUs) {
            problems.push_back({"camera", each.stream.camera, "no picture has come for ten seconds"});
        } else if (each.is_recorded && now_us - each.written_us > kMaxWrittenAgeUs) {
            problems.push_back({"camera", each.stream.camera, "nothing has reached the disk for five seconds"});
        }
    }
}

// The cameras that other hosts of the store record, or that wait for them.
std::set<int> CamerasOfOthers(store::Store& records, int host) {
    std::set<int> cameras;
    for (const store::CameraLease& lease :
         host == 0 ? std::vector<store::CameraLease>() : store::CameraLeases(records).List()) {
        const int holder = lease.host_id != 0 ? lease.host_id : lease.fixed_host_id;
        if (holder != 0 && holder != host) {
            cameras.insert(lease.camera_id);
        }
    }
    return cameras;
}

// Those that are to be recorded always, and that the recorder does not even try.
void CheckCameras(store::Store& records, int host, const std::vector<control::StreamCounters>& streams,
                  Problems& problems) {
    const std::int64_t now_s = base::WallSeconds();
    const std::map<int, store::RecordingPlan> plans = store::RecordingPlans(records).List();
    const std::set<int> of_others = CamerasOfOthers(records, host);
    for (const store::Camera& camera : store::Cameras(records).List()) {
        if (of_others.contains(camera.id)) {
            continue;
        }
        const auto plan = plans.find(camera.id);
        const bool is_recorded = std::ranges::any_of(streams, [&](const control::StreamCounters& each) {
            return each.is_recorded && each.stream.camera == camera.id;
        });
        // An hour that has just begun is the recorder's to notice.
        const auto is_due = [&](std::int64_t time_s) { return plan->second.At(time_s) == store::HourMode::kAlways; };
        if (camera.enabled && plan != plans.end() && is_due(now_s) && is_due(now_s - kHourBeginSeconds) &&
            !is_recorded) {
            problems.push_back({"camera", camera.id, "it should be recorded, but is not"});
        }
    }
}

std::optional<std::string> ProblemOf(store::Store& records, const store::Mount& mount) {
    const auto folder = maintenance::OpenMount(records, mount);
    if (!folder) {
        return "its disk is not mounted";
    }
    const maintenance::MountSpace space = folder->Space();
    if (space.free_bytes < space.ReserveBytes() || space.free_files < space.ReserveFiles()) {
        return "its disk is full";
    }
    return ::access(mount.path.c_str(), R_OK | W_OK | X_OK) == 0 ? std::nullopt
                                                                 : std::optional<std::string>("it cannot be written");
}

void CheckMounts(const base::Installation& installation, store::Store& records, Problems& problems) {
    for (const store::Mount& mount : store::Mounts(records).List()) {
        if (!mount.enabled || !mount.IsOf(installation.HostId())) {
            continue;
        }
        std::optional<std::string> problem;
        try {
            problem = ProblemOf(records, mount);
            for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation)) {
                if (!problem && status.mount == mount.id && status.state != maintenance::MountState::kReady) {
                    problem = std::string(maintenance::NameOf(status.state)) + ' ' + status.reason;
                }
            }
            // A host may do without a shared mount that others have.
            if (problem && maintenance::IsOnlyOnOtherHosts(installation, records, mount)) {
                problem.reset();
            }
        } catch (const std::system_error& error) {
            problem = error.what();
        }
        if (problem) {
            problems.push_back({"mount", mount.id, *problem});
        }
    }
}

}  // namespace

Problems FindProblems(const base::Installation& installation, store::Store* records) {
    Problems problems;
    std::optional<std::vector<control::StreamCounters>> streams;
    if (const auto state = control::FindRecorder(installation); state != control::RecorderState::kAlive) {
        problems.push_back({"recorder", 0, state == control::RecorderState::kHangs ? "it hangs" : "it does not run"});
    } else if (streams = control::ReadStreamCounters(installation); streams) {
        CheckStreams(*streams, problems);
    } else {
        problems.push_back({"recorder", 0, "its cameras cannot be checked, because its counts cannot be read"});
    }
    if (records == nullptr) {
        problems.push_back({"store", 0, "the record store cannot be opened"});
        return problems;
    }
    try {
        if (streams) {
            CheckCameras(*records, installation.HostId(), *streams, problems);
        }
        CheckMounts(installation, *records, problems);
    } catch (const store::StoreError&) {
        problems.push_back({"store", 0, "the record store cannot be read"});
    }
    return problems;
}

}  // namespace lookhaven::api
