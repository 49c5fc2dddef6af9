// SPDX-License-Identifier: Apache-2.0
//
// lookhaven mount: the folders that recordings are written to.
#include <optional>

#include "standalone/admin/hosts.h"
#include "standalone/admin/mounts.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/retention_text.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"

namespace lookhaven::cli {

namespace {

using store::Mount;
using store::Mounts;

struct Request {
    int id = 0;
    std::string path;
    std::optional<std::string> name;
    std::optional<std::string> limit;
    std::optional<std::string> max_age;
    std::optional<bool> enabled;
    bool make_default = false;
    bool take_over = false;
    bool is_shared = false;
    bool forget = false;
    bool yes = false;
};

Json::Value ToData(const Mount& mount) {
    return Object("id", mount.id, "name", mount.name, "path", mount.path, "max_bytes", mount.max_bytes, "max_age",
                  mount.max_age_s, "enabled", mount.enabled, "default", mount.is_default, "shared", mount.IsShared());
}

std::string LimitText(const Json::Value& bytes) {
    return bytes.asInt64() == 0 ? "none" : FormatSize(bytes.asInt64());
}

std::string FreeText(const Json::Value& mount) {
    return mount["present"].asBool()      ? FormatSize(mount["free_bytes"].asInt64())
           : mount["other_host"].asBool() ? "on another host"
                                          : "not there";
}

std::string StateText(const Json::Value& mount) {
    return std::string(mount["default"].asBool() ? "default" : "") + (mount["shared"].asBool() ? " shared" : "") +
           (mount["enabled"].asBool() ? "" : " disabled");
}

constexpr Column kColumns[] = {
    {"id", "id"},
    {"name", "name"},
    {"events", "events"},
    {"size", "size_bytes", [](const Json::Value& size) { return FormatSize(size.asInt64()); }},
    {"limit", "max_bytes", LimitText},
    {"max age", "max_age", MaxAgeText},
    {"free", "", FreeText},
    {"path", "path"},
    {"", "", StateText}};

admin::MountChange ChangeOf(const Console& console, store::Store& store, const Request& request) {
    admin::MountChange change{.name = request.name, .enabled = request.enabled};
    if (!request.path.empty()) {
        change.path = request.path;
    }
    if (request.limit) {
        change.max_bytes = ParseSize(*request.limit);
    }
    if (request.max_age) {
        change.max_age_s = ParseDuration(*request.max_age);
    }
    change.own_host = admin::OwnHost(store, console.Installation());
    change.is_default = request.make_default;
    change.is_shared = request.is_shared;
    change.take_over = request.take_over;
    change.confirmed = request.yes;
    return change;
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Mount mount = admin::AddMount(store, {}, ChangeOf(console, store, request));
    console.Answer(ToData(mount), "Added mount ", mount.name, " with id ", mount.id, ".");
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    try {
        const Mount mount = admin::SetMount(store, {}, request.id, {}, ChangeOf(console, store, request));
        console.Answer(ToData(mount), "Changed mount ", mount.name, ".");
    } catch (const admin::DeletesRecordings& refusal) {
        AskToConfirm(refusal);
    }
}

// Nothing when the disk is not mounted, fails or does not report it.
std::optional<std::int64_t> FreeBytes(store::Store& store, const Mount& mount) {
    try {
        const auto folder = maintenance::OpenMount(store, mount);
        const maintenance::MountSpace space = folder ? folder->Space() : maintenance::MountSpace{};
        return space.total_bytes > 0 ? std::optional(space.free_bytes) : std::nullopt;
    } catch (const std::system_error&) {
        return std::nullopt;
    }
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    store::Events events(store);
    const int host = console.Installation().HostId();
    Json::Value data = Json::arrayValue;
    for (const Mount& mount : Mounts(store).List()) {
        const store::MountContent content = events.Content(mount.id);
        const auto free_bytes = mount.IsOf(host) ? FreeBytes(store, mount) : std::nullopt;
        Json::Value& entry = data.append(ToData(mount));
        entry["events"] = content.events;
        entry["size_bytes"] = content.size_bytes;
        entry["other_host"] = !mount.IsOf(host);
        entry["present"] = free_bytes.has_value();
        entry["free_bytes"] = free_bytes.value_or(0);
    }
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::int64_t events = store::Events(store).Content(request.id).events;
    if (events > 0 && !request.forget) {
        throw Failure(kDataError, "the mount holds ", events,
                      " events: with --forget they are removed from the store too, while the files stay");
    }
    admin::RemoveMount(store, {}, request.id, {}, request.forget);
    console.Answer(Object("id", request.id, "events_forgotten", events), "Removed mount ", request.id,
                   "; its files stay.");
}

}  // namespace

void AddMount(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "mount",
                                "Storage mounts: the folders that recordings are written to");
    Request& request = group.request();
    const auto add_properties = [&](Command& command) {
        command.Option("--name", request.name, "The mount's name")
            .Option("--limit", request.limit,
                    "Total size of its recordings, such as 500G; 0 for no limit but the disk's")
            .Option("--max-age", request.max_age, "Age up to which recordings are kept, such as 30d; 0 for no limit")
            .Flag("--default", request.make_default, "Record cameras here that name no mount")
            .Flag("--take-over", request.take_over, "Also take a folder that belongs to another mount or installation")
            .Switch("--enable,!--disable", request.enabled, "Whether recordings are written to it");
    };
    Command add = group.Add("add", "Adds an existing folder", Add)
                      .Option("path", request.path, "The folder", Required)
                      .Flag("--shared", request.is_shared, "Hosts share it: each may mount the folder at this path");
    add_properties(add);
    Command set = group.Add("set", "Changes the given properties of a mount", Change)
                      .Option("id", request.id, "The mount's id", Required)
                      .Option("--path", request.path, "The folder's new path")
                      .Flag("--yes", request.yes, "Also where a lower limit deletes recordings");
    add_properties(set);
    group.Add("list", "Lists the mounts and what they hold", List);
    group.Add("remove", "Removes a mount from the store; its files stay", Remove)
        .Option("id", request.id, "The mount's id", Required)
        .Flag("--forget", request.forget, "Also remove its events from the store");
}

}  // namespace lookhaven::cli
