// SPDX-License-Identifier: Apache-2.0
//
// lookhaven user: accounts and what is denied to them.
#include <algorithm>
#include <map>
#include <memory>
#include <optional>

#include "standalone/cli/commands.h"
#include "standalone/store/cameras.h"
#include "standalone/store/servers.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

using store::CameraAccess;
using store::DeniableItem;
using store::Privilege;
using store::User;
using store::Users;

const std::map<std::string, Privilege> kPrivileges = {
    {"owner", Privilege::kOwner}, {"manager", Privilege::kManager}, {"viewer", Privilege::kViewer}};
const std::map<std::string, CameraAccess> kAccess = {
    {"live", CameraAccess::kLive}, {"playback", CameraAccess::kPlayback}, {"audio", CameraAccess::kAudio}};

struct ItemKind {
    DeniableItem kind;
    const char* option;
    const char* name;
    const char* key;
};

constexpr ItemKind kItems[] = {{DeniableItem::kEmap, "--emap", "e-map", "denied_emaps"},
                               {DeniableItem::kDoor, "--door", "door", "denied_doors"},
                               {DeniableItem::kIoModule, "--io", "I/O module", "denied_io_modules"}};

struct Request {
    std::string name;
    Privilege privilege = Privilege::kViewer;
    std::optional<int> camera;
    std::optional<int> group;
    std::map<DeniableItem, int> items;  // at most one is taken
    std::vector<CameraAccess> kinds;
};

std::string PrivilegeName(Privilege privilege) {
    return std::find_if(kPrivileges.begin(), kPrivileges.end(),
                        [privilege](const auto& entry) { return entry.second == privilege; })
        ->first;
}

User Require(Users& users, const std::string& name) {
    const std::optional<User> user = users.FindByName(name);
    if (!user) {
        throw Failure(kNoInput, "there is no such account: lookhaven user list names them");
    }
    return *user;
}

Json::Value ToData(const User& user) {
    Json::Value data;
    data["id"] = user.id;
    data["name"] = user.name;
    data["privilege"] = static_cast<int>(user.privilege);
    return data;
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const User user = Users(store).Add(request.name, ReadPassword(request.name, true), request.privilege);
    console.Answer("The account " + user.name + " may log in as " + PrivilegeName(user.privilege) + ".", ToData(user));
}

// "live 1 2; audio 2"
std::string DeniedText(Users& users, int user, std::set<int> (Users::*denied)(int, CameraAccess), Json::Value& data) {
    std::string text;
    for (const auto& [name, kind] : kAccess) {
        data[name] = Json::arrayValue;
        std::string ids;
        for (const int id : (users.*denied)(user, kind)) {
            data[name].append(id);
            ids += " " + std::to_string(id);
        }
        text += ids.empty() ? "" : (text.empty() ? "" : "; ") + name + ids;
    }
    return text;
}

// "e-map 1 2; door 4"
std::string DeniedItemsText(Users& users, int user, Json::Value& data) {
    std::string text;
    for (const ItemKind& kind : kItems) {
        data[kind.key] = Json::arrayValue;
        std::string ids;
        for (const int id : users.DeniedItems(user, kind.kind)) {
            data[kind.key].append(id);
            ids += " " + std::to_string(id);
        }
        text += ids.empty() ? "" : (text.empty() ? "" : "; ") + (kind.name + ids);
    }
    return text;
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Users users(store);
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "privilege", "denied cameras", "denied groups", "denied else"}};
    for (const User& user : users.List()) {
        Json::Value entry = ToData(user);
        rows.push_back({std::to_string(user.id), user.name, PrivilegeName(user.privilege),
                        DeniedText(users, user.id, &Users::DeniedCameras, entry["denied"]),
                        DeniedText(users, user.id, &Users::DeniedGroups, entry["denied_groups"]),
                        DeniedItemsText(users, user.id, entry)});
        data.append(entry);
    }
    console.Answer(Table(rows), data);
}

void SetPassword(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = Require(users, request.name);
    users.SetPassword(user.id, ReadPassword(user.name, true));
    console.Answer("The account " + user.name + " has a new password and is logged out everywhere.", ToData(user));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = Require(users, request.name);
    const std::vector<User> all = users.List();
    const auto owners =
        std::count_if(all.begin(), all.end(), [](const User& other) { return other.privilege == Privilege::kOwner; });
    if (user.privilege == Privilege::kOwner && owners == 1) {
        throw Failure(kDataError, user.name + " is the only owner: make another one first");
    }
    users.Remove(user.id);
    console.Answer("The account " + user.name + " is gone.", ToData(user));
}

void PermitKind(Users& users, int user, const Request& request, bool allow, CameraAccess kind) {
    if (request.group) {
        allow ? users.AllowGroup(user, *request.group, {kind}) : users.DenyGroup(user, *request.group, {kind});
    } else {
        allow ? users.Allow(user, *request.camera, {kind}) : users.Deny(user, *request.camera, {kind});
    }
}

void RequireCamera(store::Store& store, int id) {
    if (!store::Cameras(store).Find(id) && !store::RecordingServers(store).FindCamera(id)) {
        throw Failure(kNoInput, "there is no camera " + std::to_string(id) + ": lookhaven camera list names them");
    }
}

// Of a camera or group; the sentence's rest.
std::string PermitCamera(store::Store& store, int user, const Request& request, bool allow) {
    if (!allow && request.camera) {
        RequireCamera(store, *request.camera);
    }
    Users users(store);
    bool still_denied = false;
    for (const CameraAccess kind : request.kinds.empty() ? std::vector(store::kEveryAccess) : request.kinds) {
        PermitKind(users, user, request, allow, kind);
        still_denied =
            still_denied || (allow && request.camera && users.DeniedCameras(user, kind).contains(*request.camera));
    }
    return still_denied ? ", but belongs to a group that is denied." : ".";
}

std::string Subject(const Request& request) {
    for (const ItemKind& kind : kItems) {
        if (const auto item = request.items.find(kind.kind); item != request.items.end()) {
            return kind.name + std::string(" ") + std::to_string(item->second);
        }
    }
    return request.group ? "group " + std::to_string(*request.group) : "camera " + std::to_string(*request.camera);
}

void Permit(const Console& console, const Request& request, bool allow) {
    if ((request.camera ? 1U : 0U) + (request.group ? 1U : 0U) + request.items.size() != 1) {
        throw Failure(kUsage, "name one camera, group, e-map, door or I/O module: see lookhaven user deny --help");
    }
    if (!request.items.empty() && !request.kinds.empty()) {
        throw Failure(kUsage, "a kind of access is one to cameras and groups: leave --kind out");
    }
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = Require(users, request.name);
    std::string rest = ".";
    if (request.items.empty()) {
        rest = PermitCamera(store, user.id, request, allow);
    } else {
        const auto [kind, item] = *request.items.begin();
        allow ? users.AllowItem(user.id, kind, item) : users.DenyItem(user.id, kind, item);
    }
    console.Answer("The " + Subject(request) + (allow ? " is allowed to " : " is denied to ") + user.name + rest,
                   ToData(user));
}

}  // namespace

void AddUser(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("user", "Accounts and their rights")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->add_option("name", request->name, "The account")->required();
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    CLI::App* add = command("add", "Makes an account; its password is asked for", Add);
    Choose(add->add_option("--privilege", request->privilege, "How much it may do (else viewer)"), kPrivileges);
    group->add_subcommand("list", "Lists the accounts")->callback([&console] { List(console); });
    command("passwd", "Changes a password and ends the account's sessions", SetPassword);
    command("remove", "Removes an account and ends its sessions", Remove);
    for (CLI::App* permit :
         {command("deny", "Denies one thing and ends the account's sessions",
                  [](const Console&c, const Request&r) { Permit(c, r, false); }),
          command("allow", "Allows it again", [](const Console&c, const Request&r) { Permit(c, r, true); })}) {
        permit->add_option("camera", request->camera, "The camera's id");
        permit->add_option("--group", request->group, "A group's id instead: all that its cameras are and will be");
        for (const ItemKind& kind : kItems) {
            permit->add_option_function<int>(
                kind.option, [request, &kind](int id) { request->items[kind.kind] = id; },
                std::string("An id instead: ") + kind.name);
        }
        Choose(permit->add_option("--kind", request->kinds, "What exactly; may be repeated (else everything)"), kAccess)
            ->allow_extra_args(false);
    }
}

}  // namespace lookhaven::cli
