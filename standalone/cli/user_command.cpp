// SPDX-License-Identifier: Apache-2.0
//
// lookhaven user: accounts and what they are denied.
#include <algorithm>
#include <functional>
#include <map>
#include <optional>

#include "standalone/admin/users.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
#include "standalone/store/cameras.h"
#include "standalone/store/servers.h"
#include "standalone/store/users.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

using store::CameraAccess;
using store::DeniableItem;
using store::Privilege;
using store::User;
using store::Users;

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
    return NameOf(store::PrivilegeNames(), static_cast<Privilege>(privilege.asInt()));
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
    for (const auto& [name, kind] : store::CameraAccessNames()) {
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

// As it is after a change.
Json::Value DataOf(store::Store& store, const std::string& name) {
    Users users(store);
    return ToData(RequireUser(users, name));
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::AddUser(
        store, {}, request.name,
        {.password = store::HashedPassword(ReadPassword(request.name, true)), .privilege = request.privilege});
    const Json::Value user = DataOf(store, request.name);
    console.Answer(user, "Added account ", request.name, " as ", PrivilegeName(user["privilege"]), ".");
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Users users(store);
    Json::Value data = Json::arrayValue;
    for (const User& user : users.List()) {
        Json::Value& entry = data.append(ToData(user));
        store::Denials denials = users.FindDenials(user.id);
        for (const auto& [name, kind] : store::CameraAccessNames()) {
            entry["denied"][name] = Ids(users.DeniedCameras(user.id, kind));
            entry["denied_groups"][name] = Ids(denials.groups[kind]);
        }
        for (const ItemKind& kind : kItems) {
            entry[kind.key] = Ids(denials.items[kind.kind]);
        }
    }
    console.Answer(data, Table(kColumns, data));
}

void SetPassword(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    admin::SetUser(store, {}, user.id, {}, {.password = store::HashedPassword(ReadPassword(user.name, true))});
    console.Answer(ToData(user), "Account ", user.name, " has a new password and is logged out everywhere.");
}

void SetPrivilege(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    admin::SetUser(store, {}, user.id, {}, {.privilege = request.privilege});
    const Json::Value data = DataOf(store, user.name);
    console.Answer(data, "Account ", user.name, " is ", PrivilegeName(data["privilege"]), " now.");
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Users users(store);
    const User user = RequireUser(users, request.name);
    admin::RemoveUser(store, {}, user.id, {});
    console.Answer(ToData(user), "Removed account ", user.name, ".");
}

void RequireCamera(store::Store& store, int id) {
    if (!store::Cameras(store).Find(id) && !store::RecordingServers(store).FindCamera(id)) {
        throw Failure(kNoInput, "there is no camera ", id, ": see lookhaven camera list");
    }
}

void Permit(std::set<int>& denied, int id, bool allow) {
    if (allow) {
        denied.erase(id);
    } else {
        denied.insert(id);
    }
}

std::vector<CameraAccess> KindsOf(const Request& request) {
    return request.kinds.empty() ? std::vector(store::kEveryAccess) : request.kinds;
}

// The end of the answer.
std::string EndOfAllowance(Users& users, int user, const Request& request) {
    const std::vector<CameraAccess> kinds = KindsOf(request);
    const auto is_denied = [&](CameraAccess kind) { return users.DeniedCameras(user, kind).contains(*request.camera); };
    if (!request.camera || std::ranges::none_of(kinds, is_denied)) {
        return ".";
    }
    const bool is_export_alone = std::ranges::all_of(
        kinds, [&](CameraAccess kind) { return kind == CameraAccess::kExport || !is_denied(kind); });
    return is_export_alone && is_denied(CameraAccess::kPlayback)
               ? ", but playback of it is denied, without which nothing is exported."
               : ", but belongs to a group that is denied.";
}

// The item that the request names; null when it names a camera or group.
const ItemKind* NamedItem(const Request& request) {
    const auto* kind =
        std::ranges::find_if(kItems, [&](const ItemKind& each) { return request.items.at(each.kind).has_value(); });
    return kind == std::end(kItems) ? nullptr : kind;
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
    std::string subject;
    admin::UserChange change;
    if (request.marks) {
        subject = "reporting of alerts and POS transactions";
        change.may_mark = allow;
    } else if (item != nullptr) {
        const int id = *request.items.at(item->kind);
        subject = Concat(item->name, " ", id);
        change.denials = [item, id, allow](store::Denials& denials) { Permit(denials.items[item->kind], id, allow); };
    } else {
        const int id = request.group ? *request.group : *request.camera;
        subject = Concat(request.group ? "group " : "camera ", id);
        if (!allow && request.camera) {
            RequireCamera(store, id);
        }
        change.denials = [&request, id, allow](store::Denials& denials) {
            for (const CameraAccess kind : KindsOf(request)) {
                Permit((request.group ? denials.groups : denials.cameras)[kind], id, allow);
            }
        };
    }
    admin::SetUser(store, {}, user.id, {}, change);
    console.Answer(DataOf(store, user.name), "The ", subject, allow ? " is allowed to " : " is denied to ", user.name,
                   allow ? EndOfAllowance(users, user.id, request) : ".");
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
        .Option("--privilege", request.privilege, "Its privilege (default: viewer)", OneOf(store::PrivilegeNames()));
    group.Add("list", "Lists the accounts", List);
    add_command("set", "Changes an account's privilege and ends its sessions", SetPrivilege)
        .Option("--privilege", request.privilege, "Its new privilege", OneOf(store::PrivilegeNames()), Required);
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
        command.Option("--kind", request.kinds, "The kind of access; may be repeated (default: all)",
                       OneOf(store::CameraAccessNames()), Repeatable);
    }
}

}  // namespace lookhaven::cli
