// SPDX-License-Identifier: Apache-2.0
//
// Storage mounts: what keeps recordings from being written to them.
#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <iterator>
#include <map>
#include <system_error>

#include <unistd.h>

#include "standalone/base/amounts.h"
#include "standalone/base/concat.h"
#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/shared_folder.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::doctor {

namespace {

using base::Concat;
using base::FormatSize;

std::string TitleOf(const store::Mount& mount) {
    return "the mount " + mount.name + " at " + mount.path;
}

// The folder is the mount's own.
Findings CheckSpace(store::Store& store, const store::Mount& mount, const maintenance::MountFolder& folder) {
    Findings findings;
    const maintenance::MountSpace space = folder.Space();
    if (space.free_bytes < space.ReserveBytes()) {
        findings.push_back({Concat(TitleOf(mount), " has only ", FormatSize(space.free_bytes),
                                   " left, recording needs ", FormatSize(space.ReserveBytes())),
                            "free space on its disk, or lower its limit with lookhaven mount set"});
    }
    const std::int64_t kept = store::KeptEvents(store).SizeBytes(mount.id);
    if (mount.max_bytes > 0 && kept >= mount.max_bytes) {
        findings.push_back(
            {Concat("kept recordings alone take ", FormatSize(kept), " of ", TitleOf(mount), ", whose limit is ",
                    FormatSize(mount.max_bytes), ": whatever else is recorded is deleted at once"),
             Concat(
                 "release kept recordings, which lookhaven event list --kept lists, with lookhaven event release, or "
                 "raise the limit: lookhaven mount set ",
                 mount.id, " --limit")});
        return findings;
    }
    const std::int64_t held = store::Events(store).Content(mount.id).size_bytes;
    if (mount.max_bytes > 0 && held > mount.max_bytes + mount.max_bytes / 10) {
        findings.push_back(
            {Concat(TitleOf(mount), " holds ", FormatSize(held), " of recordings, above its limit of ",
                    FormatSize(mount.max_bytes)),
             "start the recorder, which removes the oldest; kept events stay, raise the limit for them"});
    }
    return findings;
}

// What was copied back by another user than the server's cannot be written to.
Findings CheckCameraFolders(const store::Mount& mount) {
    for (const auto& entry : std::filesystem::directory_iterator(mount.path)) {
        const std::string name = entry.path().filename();
        if (entry.is_directory() && name.find_first_not_of("0123456789") == std::string::npos &&
            ::access(entry.path().c_str(), R_OK | W_OK | X_OK) != 0) {
            return CheckAccess("the folder " + entry.path().string(), entry.path());
        }
    }
    return {};
}

bool IsReadable(const store::Mount& mount) {
    const std::string marker = mount.path + "/" + maintenance::kMarkerName;
    return ::access(mount.path.c_str(), R_OK | X_OK) == 0 && (::access(marker.c_str(), R_OK) == 0 || errno == ENOENT);
}

Findings CheckEnabled(const base::Installation& installation, store::Store& store, const store::Mount& mount) {
    if (maintenance::IsOnlyOnOtherHosts(installation, store, mount)) {
        return {
            {Concat(TitleOf(mount), ", which hosts share, is not mounted here: this host records elsewhere, and plays"
                                    " what is on it through the others"),
             Concat("to use it here, mount it at ", Quoted(mount.path)), Severity::kNote}};
    }
    if (::access(mount.path.c_str(), F_OK) != 0) {
        return {{TitleOf(mount) + " is not there",
                 Concat("mount its disk, or, where its folder has moved: lookhaven mount set ", mount.id,
                        " --path FOLDER")}};
    }
    // A bare mount point is somebody else's folder, too: first of all, whether the disk is there.
    if (!IsReadable(mount)) {
        Findings findings = CheckAccess(TitleOf(mount), mount.path);
        return !findings.empty() ? findings
                                 : Findings{{"the marker of " + TitleOf(mount) + " cannot be read",
                                             Concat("as root: chown -R ", OwnName(), ": ", Quoted(mount.path))}};
    }
    const auto folder = maintenance::OpenMount(store, mount);
    if (!folder) {
        // A mount point without its disk has no marker: nothing that marks it may be advised.
        return {{maintenance::MountFolder::ReadMarker(mount.path)
                     ? Finding{TitleOf(mount) + " holds recordings of another mount or installation",
                               Concat("mount its own disk, or lookhaven mount set ", mount.id, " --take-over")}
                     : Finding{TitleOf(mount) + " has no marker: its disk is not mounted", "mount its disk"}}};
    }
    Findings findings = CheckAccess(TitleOf(mount), mount.path);
    if (!findings.empty()) {
        return findings;
    }
    findings = CheckCameraFolders(mount);
    std::ranges::move(CheckSpace(store, mount, *folder), std::back_inserter(findings));
    return findings;
}

// Cameras that are to be recorded to each mount.
std::map<int, int> CountCamerasByMount(store::Store& store, int host) {
    std::map<int, int> cameras;
    const std::map<int, store::RecordingPlan> plans = store::RecordingPlans(store).List();
    store::Mounts mounts(store);
    for (const store::Camera& camera : store::Cameras(store).List()) {
        const auto plan = plans.find(camera.id);
        if (camera.enabled && plan != plans.end() && plan->second.mode != store::RecordMode::kNever) {
            const auto mount = mounts.FindForPlan(plan->second.mount_id, host);
            ++cameras[mount ? mount->id : 0];
        }
    }
    return cameras;
}

Findings CheckDisabled(const store::Mount& mount, int cameras) {
    return {{Concat(TitleOf(mount), " is disabled",
                    cameras == 0 ? "" : Concat(", so that ", cameras, " of the cameras are not recorded")),
             Concat("lookhaven mount set ", mount.id, " --enable"), cameras == 0 ? Severity::kNote : Severity::kFault}};
}

}  // namespace

// Those of this machine, which alone can look at them.
Findings CheckMounts(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        std::vector<store::Mount> mounts = store::Mounts(store).List();
        const int host = installation.HostId();
        std::erase_if(mounts, [host](const store::Mount& mount) { return !mount.IsOf(host); });
        if (mounts.empty()) {
            return {{"there is no mount to record to", host == 0 ? "lookhaven init" : "lookhaven mount add FOLDER"}};
        }
        std::map<int, int> cameras = CountCamerasByMount(store, host);
        for (const store::Mount& mount : mounts) {
            try {
                std::ranges::move(mount.enabled ? CheckEnabled(installation, store, mount)
                                                : CheckDisabled(mount, cameras[mount.id]),
                                  std::back_inserter(findings));
            } catch (const std::system_error& error) {
                findings.push_back({TitleOf(mount) + " fails: " + error.what(), "check the disk"});
            }
        }
    } catch (const std::exception&) {
        return {};  // CheckStore reports it
    }
    return findings;
}

// What the recorder's own work on the mounts meets.
Findings CheckMaintenance(const base::Installation& installation) {
    control::CommonConfig* config = control::MapCommonConfig(installation);
    Findings findings;
    if (config != nullptr && control::IsRecorderAlive(*config)) {
        for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation)) {
            if (status.state == maintenance::MountState::kInUse) {
                findings.push_back({Concat("mount ", status.mount, " is used by the recorder of another state folder"),
                                    "stop that recorder, or give this installation a mount of its own"});
            }
            if (status.state == maintenance::MountState::kSpaceHeld) {
                findings.push_back(
                    {Concat("the disk of mount ", status.mount, " at ", status.reason,
                            " is full and gets no space back from deleted recordings, so hardly any are deleted now"),
                     "remove the snapshots or copies that still hold them; recording then resumes by itself"});
            }
            if (status.state == maintenance::MountState::kFailing) {
                findings.push_back({Concat("the recorder's work on mount ", status.mount, " fails: ", status.reason),
                                    "check that disk; the work then resumes by itself"});
            }
        }
    }
    return findings;
}

}  // namespace lookhaven::doctor
