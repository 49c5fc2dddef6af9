// SPDX-License-Identifier: Apache-2.0
//
// lookhaven user: accounts and what they are denied.
#include <algorithm>
#include <functional>
#include <map>
#include <optional>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
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

const Names<Privilege> kPrivileges = {
    {"owner", Privilege::kOwner}, {"manager", Privilege::kManager}, {"viewer", Privilege::kViewer}};
const Names<CameraAccess> kAccess = {
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
    std::map<DeniableItem, std::optional<int>> items;
    std::vector<CameraAccess> kinds;
    bool marks = false;
};

std::string PrivilegeName(const Json::Value& privilege) {
    return NameOf(kPrivileges, privilege.asInt());
}

User RequireUser(Users& users, const std::string& name) {
    return Require(users.FindByName(name), "there is no such account: see lookhaven user list");
}

Json::Value ToData(const User& user) {
    return Object("id", user.id, "name", user.name, "privilege", static_cast<int>(user.privilege), "may_mark",
                  user.MayMark());
}

Json::Value Ids(const std::set<int>& ids) {
    return Array(ids, std::identity());
}

void Append(std::string& text, const std::string& name, const Json::Value& ids) {
    if (!ids.empty()) {
        text += (text.empty() ? "" : "; ") + name + " " + PlainText(ids);
    }
}

// "audio 2; live 1 2"
std::string DeniedAccessText(const Json::Value& denied) {
    std::string text;
    for (const auto& [name, kind] : kAccess) {
        Append(text, name, denied[name]);
    }
    return text;
}

// "e-map 1 2; door 4"
std::string DeniedItemsText(const Json::Value& user) {
    std::string text;
    for (const ItemKind& kind : kItems) {
        Append(text, kind.name, user[kind.key]);
    }
    return text;
}

std::string YesText(const Json::Value& truth) {
    return truth.asBool() ? "yes" : "";
}

constexpr Column kColumns[] = {{"id", "id"},
                               {"name", "name"},
                               {"privilege", "privilege", PrivilegeName},
                               {"marks", "may_mark", YesText},
                               {"denied cameras", "denied", DeniedAccessText},
                               {"denied groups", "denied_groups", DeniedAccessText},
                               {"other denied items", "", DeniedItemsText}};

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Json::Value user =
        ToData(Users(store).Add(request.name, ReadPassword(request.name, true), request.privilege));
    console.Answer(user, "Added account ", request.name, " as ", PrivilegeName(user["privilege"]), ".");
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Users users(store);
    Json::Value data = Json::arrayValue;
    for (const User& user : users.List()) {
        Json::Value& entry = data.append(ToData(user));
        for (const auto& [name, kind] : kAccess) {
            entry["denied"][name] = Ids(users.DeniedCameras(user.id, kind));
            entry["denied_groups"][name] = Ids(users.DeniedGroups(user.id, kind));
        }
        for (const ItemKind& kind : kItems) {
            entry[kind.key] = Ids(users.DeniedItems(user.id, kind.kind));
        }
    }
    console.Answer(data, Table(kColumns, data));
}

void SetPassword(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    users.SetPassword(user.id, ReadPassword(user.name, true));
    console.Answer(ToData(user), "Account ", user.name, " has a new password and is logged out everywhere.");
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    const std::vector<User> all = users.List();
    if (user.privilege == Privilege::kOwner && std::ranges::count(all, Privilege::kOwner, &User::privilege) == 1) {
        throw Failure(kDataError, user.name, " is the only owner: add another one first");
    }
    users.Remove(user.id);
    console.Answer(ToData(user), "Removed account ", user.name, ".");
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
        throw Failure(kNoInput, "there is no camera ", id, ": see lookhaven camera list");
    }
}

// Of a camera or group; returns the end of the answer.
std::string PermitAccess(store::Store& store, int user, const Request& request, bool allow) {
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

// The item that the request names; null when it names a camera or group.
const ItemKind* NamedItem(const Request& request) {
    const auto* kind =
        std::ranges::find_if(kItems, [&](const ItemKind& each) { return request.items.at(each.kind).has_value(); });
    return kind == std::end(kItems) ? nullptr : kind;
}

void PermitMarks(Users& users, const User& user, bool allow) {
    if (!allow && user.IsManager()) {
        throw Failure(kDataError, user.name, " is ", PrivilegeName(static_cast<int>(user.privilege)),
                      ", and may report alerts and POS transactions as such");
    }
    allow ? users.AllowMarks(user.id) : users.DenyMarks(user.id);
}

void Permit(const Console& console, const Request& request, bool allow) {
    const auto item_count =
        std::ranges::count_if(request.items, [](const auto& item) { return item.second.has_value(); });
    if ((request.camera ? 1 : 0) + (request.group ? 1 : 0) + (request.marks ? 1 : 0) + item_count != 1) {
        throw Failure(kUsage, "name one camera, group, e-map, door or I/O module, or --mark: see lookhaven user deny"
                              " --help");
    }
    const ItemKind* item = NamedItem(request);
    if ((item != nullptr || request.marks) && !request.kinds.empty()) {
        throw Failure(kUsage, "only access to cameras and groups has a kind: leave out --kind");
    }
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    std::string subject = request.camera ? Concat("camera ", *request.camera) : "";
    std::string end = ".";
    if (request.marks) {
        subject = "reporting of alerts and POS transactions";
        PermitMarks(users, user, allow);
    } else if (item != nullptr) {
        const int id = *request.items.at(item->kind);
        subject = Concat(item->name, " ", id);
        allow ? users.AllowItem(user.id, item->kind, id) : users.DenyItem(user.id, item->kind, id);
    } else {
        subject = request.group ? Concat("group ", *request.group) : subject;
        end = PermitAccess(store, user.id, request, allow);
    }
    console.Answer(ToData(RequireUser(users, user.name)), "The ", subject, allow ? " is allowed to " : " is denied to ",
                   user.name, end);
}

void Deny(const Console& console, const Request& request) {
    Permit(console, request, false);
}

void Allow(const Console& console, const Request& request) {
    Permit(console, request, true);
}

}  // namespace

void AddUser(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "user", "Accounts and their rights");
    Request& request = group.request();
    const auto add_command = [&](const char* verb, const char* description,
                                 void (*run)(const Console&, const Request&)) {
        return group.Add(verb, description, run).Option("name", request.name, "The account's name", Required);
    };
    add_command("add", "Adds an account; prompts for its password", Add)
        .Option("--privilege", request.privilege, "Its privilege (default: viewer)", OneOf(kPrivileges));
    group.Add("list", "Lists the accounts", List);
    add_command("passwd", "Changes a password and ends the account's sessions", SetPassword);
    add_command("remove", "Removes an account and ends its sessions", Remove);
    for (Command command : {add_command("deny", "Denies one thing and ends the account's sessions", Deny),
                            add_command("allow", "Allows what was denied", Allow)}) {
        command.Option("camera", request.camera, "A camera's id")
            .Option("--group", request.group, "Instead of a camera, all cameras of this group, now and later");
        for (const ItemKind& item : kItems) {
            command.Option(item.option, request.items[item.kind],
                           std::string("Instead of a camera, this ") + item.name);
        }
        command.Flag("--mark", request.marks, "Instead of a camera, reporting alerts and POS transactions");
        command.Option("--kind", request.kinds, "The kind of access; may be repeated (default: all)", OneOf(kAccess),
                       Repeatable);
    }
}

}  // namespace lookhaven::cli
