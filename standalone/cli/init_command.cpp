// SPDX-License-Identifier: Apache-2.0
//
// lookhaven init: makes a state folder, or brings one up to date.
#include <cstdint>
#include <filesystem>
#include <memory>
#include <system_error>

#include "standalone/cli/commands.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/mounts.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

base::Installation MakeFolders(const std::string& home) {
    try {
        base::Installation::CreateFolders(home);
        base::Installation installation(home);
        control::DebugLogEditor debug_log(installation);
        return installation;
    } catch (const std::system_error& error) {
        throw Failure(kCannotCreate, "cannot set up the state folder " + home + ": " + error.code().message() +
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

// The folder "recordings" in the state folder, with half of what is free there for a limit: a trial must not fill the disk
// that the machine itself lives on. False when there is a mount already.
bool AddDefaultMount(store::Store& store, const base::Installation& installation) {
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
    maintenance::MountFolder::WriteMarker(folder, mounts.Add(mount));
    return true;
}

void Init(const Console& console, const std::string& admin) {
    const base::Installation installation = MakeFolders(console.HomePath());
    const int steps = store::Store::Migrate(installation.StoreUrl());
    store::Store store = store::Store::Open(installation.StoreUrl());
    const bool mount_added = AddDefaultMount(store, installation);
    const bool added = !admin.empty() && AddAdmin(store, admin);
    Json::Value data;
    data["home"] = installation.Home().string();
    data["migrations"] = steps;
    data["admin_added"] = added;
    data["mount_added"] = mount_added;
    console.Answer("The state folder " + installation.Home().string() + " is ready." +
                       (added           ? "\nThe account " + admin + " may log in."
                        : admin.empty() ? ""
                                        : "\nThe account " + admin + " exists already and stays as it is."),
                   data);
}

}  // namespace

void AddInit(CLI::App& program, Console& console) {
    CLI::App* init = program.add_subcommand("init", "Makes the state folder, or brings an old one up to date");
    auto admin = std::make_shared<std::string>();
    init->add_option("--admin", *admin, "Also make this owner account; its password is asked for");
    init->callback([&console, admin] { Init(console, *admin); });
}

}  // namespace lookhaven::cli
