// SPDX-License-Identifier: Apache-2.0
//
// lookhaven mount: the folders that recordings are written to.
#include <filesystem>
#include <optional>

#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/mount_claim.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/retention.h"
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
    bool forget = false;
    bool yes = false;
};

Json::Value ToData(const Mount& mount) {
    return Object("id", mount.id, "name", mount.name, "path", mount.path, "max_bytes", mount.max_bytes, "max_age",
                  mount.max_age_s, "enabled", mount.enabled, "default", mount.is_default);
}

std::string LimitText(const Json::Value& bytes) {
    return bytes.asInt64() == 0 ? "none" : FormatSize(bytes.asInt64());
}

std::string MaxAgeText(const Json::Value& seconds) {
    return seconds.asInt64() == 0 ? "none" : FormatDuration(seconds.asInt64());
}

std::string FreeText(const Json::Value& mount) {
    return mount["present"].asBool() ? FormatSize(mount["free_bytes"].asInt64()) : "not there";
}

std::string StateText(const Json::Value& mount) {
    return std::string(mount["default"].asBool() ? "default" : "") + (mount["enabled"].asBool() ? "" : " disabled");
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

// The canonical path, without links and dots.
std::string RequireFolder(const std::string& path) {
    std::error_code error;
    const std::filesystem::path folder = std::filesystem::canonical(path, error);
    if (error || !std::filesystem::is_directory(folder, error)) {
        throw Failure(kNoInput, "there is no folder ", path, ": create it, or mount its disk, first");
    }
    if (::access(folder.c_str(), R_OK | W_OK | X_OK) != 0) {
        throw Failure(kNoPermission, "you have no write access to the folder ", path, ": the server needs it");
    }
    return folder.string();
}

void Apply(Mount& mount, const Request& request) {
    mount.name = request.name.value_or(mount.name);
    mount.enabled = request.enabled.value_or(mount.enabled);
    mount.is_default = mount.is_default || request.make_default;
    if (request.limit) {
        mount.max_bytes = ParseSize(*request.limit);
    }
    if (request.max_age) {
        mount.max_age_s = ParseDuration(*request.max_age);
    }
    if (!request.path.empty()) {
        mount.path = RequireFolder(request.path);
    }
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Mount mount;
    Apply(mount, request);
    RequireFreeFolder(store, mount.path, 0, request.take_over);
    if (mount.name.empty()) {
        mount.name = std::filesystem::path(mount.path).filename();
    }
    mount.id = Mounts(store).Add(mount);
    ClaimFolder(store, mount);
    console.Answer(ToData(*Mounts(store).Find(mount.id)), "Added mount ", mount.name, " with id ", mount.id, ".");
}

// The recorder deletes within seconds what a lower limit leaves no room for.
void RequireConfirmation(store::Store& store, const Mount& before, const Mount& after) {
    const std::int64_t now_s = base::WallSeconds();
    const maintenance::RetentionForecast loss = maintenance::ForecastRetention(store, after, now_s);
    if (loss.events > maintenance::ForecastRetention(store, before, now_s).events) {
        throw Failure(kDataError, "this limit deletes the ", loss.events, " oldest recordings (",
                      FormatSize(loss.bytes), "), up to ", FormatMoment(loss.end_s), "; add --yes to confirm");
    }
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Mount before = Require(Mounts(store).Find(request.id), "there is no mount ", request.id);
    Mount mount = before;
    Apply(mount, request);
    if (!request.yes) {
        RequireConfirmation(store, before, mount);
    }
    const bool is_marked = !request.path.empty() || request.take_over;
    if (is_marked) {
        RequireFreeFolder(store, RequireFolder(mount.path), mount.id, request.take_over);
    }
    Mounts(store).Update(mount);
    if (is_marked) {
        ClaimFolder(store, mount);
    }
    console.Answer(ToData(mount), "Changed mount ", mount.name, ".");
}

// Nothing when the disk is not there, fails or does not say.
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
    Json::Value data = Json::arrayValue;
    for (const Mount& mount : Mounts(store).List()) {
        const store::MountContent content = events.Content(mount.id);
        const std::optional<std::int64_t> free_bytes = FreeBytes(store, mount);
        Json::Value& entry = data.append(ToData(mount));
        entry["events"] = content.events;
        entry["size_bytes"] = content.size_bytes;
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
    Mounts(store).Remove(request.id, request.forget);
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
    Command add = group.Add("add", "Adds an existing folder", Add).Option("path", request.path, "The folder", Required);
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
