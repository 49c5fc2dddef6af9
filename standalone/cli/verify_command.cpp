// SPDX-License-Identifier: Apache-2.0
//
// lookhaven verify: compares the store's events with the files on the mounts.
#include <algorithm>
#include <iostream>
#include <map>
#include <string>
#include <system_error>

#include <unistd.h>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_lock.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/verify.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::cli {

namespace {

void ShowProgress(std::size_t done, std::size_t all) {
    std::cerr << '\r' << done << " of " << all << " events" << (done == all ? "\n" : "") << std::flush;
}

struct Request {
    bool repair = false;
};

// Repair would rename and forget what a recorder of another state folder with the same mounts has recorded. Returns the
// mounts of which that cannot be told, by id, and why.
std::map<int, std::string> RequireOwnMounts(store::Store& store, const base::Installation& installation) {
    control::CommonConfig* config = control::MapCommonConfig(installation);
    const bool is_running = config != nullptr && control::IsRecorderAlive(*config);
    const auto states =
        is_running ? maintenance::ReadMountStatus(installation) : std::vector<maintenance::MountStatus>();
    std::map<int, std::string> unknown;
    for (const store::Mount& mount : store::Mounts(store).List()) {
        const bool is_refused = std::ranges::any_of(states, [&](const maintenance::MountStatus& status) {
            return status.mount == mount.id && status.state == maintenance::MountState::kInUse;
        });
        try {
            if (!mount.IsShared() && maintenance::OpenMount(store, mount) && (is_refused || !is_running) &&
                maintenance::MountLock::IsHeld(mount.path)) {
                throw Failure(kDataError, "the recorder of another state folder uses the mount at ", mount.path);
            }
        } catch (const std::system_error& failure) {
            unknown.emplace(mount.id, failure.what());
        }
    }
    return unknown;
}

// Why the shared mount must not be repaired on this host; empty where it may.
std::string RepairedElsewhere(store::Store& store, const store::Mount& mount, int host) {
    const int maintainer = store::SharedMounts(store).Lease(mount.id).host_id;
    if (maintainer == host || (maintainer == 0 && store::Hosts(store).All().size() == 1)) {
        return "";
    }
    const auto other = store::Hosts(store).Find(maintainer);
    return other ? "run verify --repair on host " + other->name + ", which maintains it"
                 : "no host maintains it: start the recorder of one that has it, and run verify --repair there";
}

void Verify(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    std::map<int, std::string> left_alone =
        request.repair ? RequireOwnMounts(store, console.Installation()) : std::map<int, std::string>();
    const int host = console.Installation().HostId();
    for (const store::Mount& mount : store::Mounts(store).List()) {
        if (!mount.IsOf(host)) {
            left_alone[mount.id] = "";
        } else if (request.repair && mount.IsShared()) {
            if (const std::string where = RepairedElsewhere(store, mount, host); !where.empty()) {
                left_alone[mount.id] = where;
            }
        }
    }
    const bool watched = ::isatty(STDERR_FILENO) != 0 && !console.json;
    const maintenance::VerifyReport report =
        maintenance::Verify(store, request.repair,
                            watched ? ShowProgress : std::function<void(std::size_t, std::size_t)>(), left_alone, host);
    Json::Value faults = Json::arrayValue;
    std::string text;
    std::size_t left = 0;
    for (const maintenance::Fault& fault : report.faults) {
        faults.append(Object("problem", fault.problem, "done", fault.done));
        text += fault.problem + "\n" + (fault.done.empty() ? "" : "  done: " + fault.done + "\n");
        left += fault.done.empty() ? 1 : 0;
    }
    console.Answer(Object("events", report.events, "frames", report.frames, "faults", faults), text, report.events,
                   " events with ", report.frames, " frames were checked.");
    if (left > 0) {
        throw Failure(kFindings, left == 1 ? "there is one fault" : Concat("there are ", left, " faults"),
                      request.repair ? " that could not be repaired" : ": try lookhaven verify --repair");
    }
}

}  // namespace

void AddVerify(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("verify", "Checks that recordings and store agree", Verify)
        .Flag("--repair", group.request().repair, "Repair what can be repaired; unknown files are left alone");
}

}  // namespace lookhaven::cli
