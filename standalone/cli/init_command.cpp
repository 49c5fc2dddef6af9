// SPDX-License-Identifier: Apache-2.0
//
// lookhaven init: creates the state folder, or upgrades an existing one.
#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <system_error>

#include "standalone/admin/hosts.h"
#include "standalone/admin/mount_claim.h"
#include "standalone/admin/mounts.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/base/state_folder.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/units.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/emap/pictures.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/mounts.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::string admin;
    bool ahead = false;
};

// As an interrupted attempt leaves it.
bool HoldsEmptyFoldersOnly(const std::string& home) {
    std::error_code error;
    return std::ranges::all_of(std::filesystem::directory_iterator(home, error), [](const auto& entry) {
        std::error_code ignored;
        return entry.is_directory(ignored) && std::filesystem::is_empty(entry.path(), ignored);
    });
}

// A folder with other files in it is not ours to use or change.
void RequireOwnFolder(const std::string& home) {
    std::error_code error;
    if (!base::IsStateFolder(home) && std::filesystem::exists(home, error) && !HoldsEmptyFoldersOnly(home) && !error) {
        throw Failure(kCannotCreate, "the folder ", home,
                      " is not empty and is not a state folder: choose another with --home");
    }
}

base::Installation CreateFolders(const std::string& home) {
    RequireOwnFolder(home);
    try {
        base::Installation::CreateFolders(home);
        base::Installation installation(home);
        control::DebugLogEditor debug_log(installation);
        return installation;
    } catch (const std::system_error& error) {
        throw Failure(kCannotCreate, "cannot set up the state folder ", home, ": ", error.code().message(),
                      "; choose another with --home or make this one writable");
    }
}

bool AddAdmin(store::Store& store, const std::string& name) {
    store::Users users(store);
    if (users.FindByName(name)) {
        return false;
    }
    users.Add(name, ReadPassword(name, true), store::Privilege::kOwner);
    return true;
}

// The store that knew the recordings there may have been lost. They are then more than the limit of a new mount allows,
// so taking the folder over is left to the command that sets none.
[[noreturn]] void RefuseFolderOfLostStore(const Console& console, const std::string& folder) {
    const std::string program = Concat(
        "lookhaven ", console.home_option.empty() ? "" : Concat("--home ", doctor::Quoted(console.HomePath()), " "));
    throw Failure(kDataError, "the folder ", folder,
                  " belongs to another installation of Lookhaven, or to this one before its store was lost: to keep "
                  "what is recorded there, restore the store from a backup, or run ",
                  program, "mount add ", doctor::Quoted(folder), " --take-over; then run this command again, and ",
                  program, "verify --repair");
}

// The folder "recordings" in the state folder, limited to half of the free space: a trial must not fill the system's
// disk. False when there is a mount already.
bool AddDefaultMount(store::Store& store, const base::Installation& installation, const Console& console) {
    store::Mounts mounts(store);
    if (!mounts.List().empty()) {
        return false;
    }
    const std::filesystem::path folder = installation.Home() / "recordings";
    if (std::filesystem::create_directories(folder)) {
        std::filesystem::permissions(folder, std::filesystem::perms::owner_all);
    }
    store::Mount mount;
    mount.name = "default";
    mount.path = folder.lexically_normal().string();
    mount.max_bytes = static_cast<std::int64_t>(std::filesystem::space(folder).available / 2);
    try {
        admin::RequireFreeFolder(store, mount.path, 0, false);
    } catch (const admin::UnusableFolder&) {
        RefuseFolderOfLostStore(console, mount.path);
    }
    mount.id = mounts.Add(mount);
    admin::MarkFolder(store, mount);
    admin::ReserveIds(store, mount);
    return true;
}

// A mount that lay in the state folder moves along with it: the folder's marker says whose it is. No other does, such
// as one on a disk that is unplugged just now.
void FollowStateFolder(store::Store& store, const base::Installation& installation) {
    const std::string here = std::filesystem::canonical(installation.Home());
    const std::filesystem::path known = installation.LocationFile();
    const std::string before = std::filesystem::exists(known) ? base::ReadFile(known) : "";
    if (before == here) {
        return;
    }
    for (const store::Mount& mount : store::Mounts(store).List()) {
        try {
            const std::filesystem::path path = mount.path;
            if (path.parent_path() != before) {
                continue;
            }
            const std::filesystem::path moved = here / path.filename();
            const maintenance::MountMarker marker = maintenance::MarkerFor(store, mount.id);
            if (mount.IsOf(installation.HostId()) && !mount.IsShared() && !std::filesystem::exists(mount.path) &&
                maintenance::MountFolder::ReadMarker(moved) == marker) {
                const int own_host = admin::OwnHost(store, installation);
                admin::SetMount(store, {}, mount.id, {}, {.path = moved.string(), .own_host = own_host});
            }
        } catch (const std::exception& error) {  // its path can still be set by hand
            base::LogWarning(Concat("cannot find where mount ", mount.id, " has moved to: ", error.what()));
        }
    }
    base::WriteFileAtomically(known, here);
}

// Early versions marked their mounts without saying whose they are.
void RenewMarkers(store::Store& store) {
    for (const store::Mount& mount : store::Mounts(store).List()) {
        try {
            if (maintenance::MountFolder::ReadMarker(mount.path) == maintenance::MountMarker{mount.id, ""}) {
                maintenance::MountFolder::WriteMarker(mount.path, maintenance::MarkerFor(store, mount.id));
            }
        } catch (const std::system_error&) {
            continue;  // lookhaven doctor says what is wrong with it
        }
    }
}

// Where there is no room for the copy the upgrade continues without one: cameras are not recorded meanwhile.
void CopyOlderStore(const base::Installation& installation) {
    try {
        store::Store::CopyIfOlder(installation.StoreUrl(), installation.Home());
    } catch (const store::StoreError& error) {
        base::LogError(Concat("no copy of the store was made, so this upgrade cannot be undone: ", error.what()));
    }
}

// Made while the older programs still record, so that they are stopped for a shorter time.
void CopyAhead(const Console& console) {
    const base::Installation installation = console.Installation();
    const bool copied =
        store::Store::CopyIfOlder(installation.StoreUrl(), installation.Home(), store::Store::Copy::kAhead);
    console.Answer(Object("copied", copied), copied ? "The store was copied: this version will change it."
                                                    : "This version changes nothing in the store.");
}

void Init(const Console& console, const Request& request) {
    if (request.ahead) {
        CopyAhead(console);
        return;
    }
    console.BecomeOwner();
    const std::string& admin = request.admin;
    const base::Installation installation = CreateFolders(console.HomePath());
    CopyOlderStore(installation);
    const int steps = store::Store::Migrate(installation.StoreUrl());
    store::Store store = store::Store::Open(installation.StoreUrl());
    const bool mount_added = AddDefaultMount(store, installation, console);
    RenewMarkers(store);
    emap::Pictures(store, installation.Home()).Share();
    try {
        FollowStateFolder(store, installation);
    } catch (const std::system_error& error) {  // such as a full disk, with which the services start all the same
        base::LogWarning(std::string("cannot note where the state folder is: ") + error.what());
    }
    const bool admin_added = !admin.empty() && AddAdmin(store, admin);
    const std::string home = installation.Home().string();
    std::string text = "The state folder " + home + " is ready.";
    if (mount_added) {
        const store::Mount mount = store::Mounts(store).List().front();
        text += "\nRecordings lie in " + mount.path + " and take up to " + FormatSize(mount.max_bytes) +
                ", then the oldest are deleted: lookhaven mount set " + std::to_string(mount.id) +
                " --limit changes that.";
    }
    if (!admin.empty()) {
        text += admin_added ? "\nAdded account " + admin + "."
                            : "\nAccount " + admin + " exists already and was not changed.";
    }
    if (store::Users(store).IsEmpty()) {
        text += "\nThere is no account yet: lookhaven setup-address prints an address that makes one in a browser.";
    }
    console.Answer(Object("home", home, "migrations", steps, "admin_added", admin_added, "mount_added", mount_added),
                   text);
}

}  // namespace

void AddInit(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("init", "Creates the state folder, or upgrades an existing one", Init)
        .Option("--admin", group.request().admin, "Also add this owner account; prompts for its password")
        .Flag("--ahead", group.request().ahead,
              "Only copy the store, where this version will change it, before the older one is stopped");
}

}  // namespace lookhaven::cli
