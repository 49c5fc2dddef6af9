// SPDX-License-Identifier: Apache-2.0
//
// lookhaven init: makes a state folder, or brings one up to date.
#include <memory>
#include <system_error>

#include "standalone/base/debug_log_config.h"
#include "standalone/cli/commands.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

base::Installation MakeFolders(const std::string& home) {
    try {
        base::Installation::CreateFolders(home);
        base::Installation installation(home);
        base::DebugLogEditor debug_log(installation);
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

void Init(const Console& console, const std::string& admin) {
    const base::Installation installation = MakeFolders(console.HomePath());
    const int steps = store::Store::Migrate(installation.StoreUrl());
    store::Store store = store::Store::Open(installation.StoreUrl());
    const bool added = !admin.empty() && AddAdmin(store, admin);
    Json::Value data;
    data["home"] = installation.Home().string();
    data["migrations"] = steps;
    data["admin_added"] = added;
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
