// SPDX-License-Identifier: Apache-2.0
//
// lookhaven mount: the folders that recordings are written to.
#include <filesystem>
#include <memory>
#include <optional>

#include <unistd.h>

#include "standalone/cli/commands.h"
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
    bool forget = false;
};

Json::Value ToData(const Mount& mount) {
    Json::Value data;
    data["id"] = mount.id;
    data["name"] = mount.name;
    data["path"] = mount.path;
    data["max_bytes"] = Json::Int64(mount.max_bytes);
    data["max_age"] = Json::Int64(mount.max_age_s);
    data["enabled"] = mount.enabled;
    data["default"] = mount.is_default;
    return data;
}

// The folder as it is stored, whatever links and dots lead to it.
std::string RequireFolder(const std::string& path) {
    std::error_code error;
    const std::filesystem::path folder = std::filesystem::canonical(path, error);
    if (error || !std::filesystem::is_directory(folder, error)) {
        throw Failure(kNoInput, "there is no folder " + path + ": make it, or mount its disk, first");
    }
    if (::access(folder.c_str(), R_OK | W_OK | X_OK) != 0) {
        throw Failure(kNoPermission, "the folder " + path + " cannot be written by you: the server has to write it");
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
    if (mount.name.empty()) {
        mount.name = std::filesystem::path(mount.path).filename();
    }
    mount.id = Mounts(store).Add(mount);
    maintenance::MountFolder::WriteMarker(mount.path, mount.id);
    console.Answer("The mount " + mount.name + " has the id " + std::to_string(mount.id) + ".",
                   ToData(*Mounts(store).Find(mount.id)));
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    std::optional<Mount> mount = Mounts(store).Find(request.id);
    if (!mount) {
        throw store::NotFound("there is no mount " + std::to_string(request.id));
    }
    Apply(*mount, request);
    Mounts(store).Update(*mount);
    if (!request.path.empty()) {
        maintenance::MountFolder::WriteMarker(mount->path, mount->id);
    }
    console.Answer("The mount " + mount->name + " is changed.", ToData(*mount));
}

std::string Limit(std::int64_t value, std::string (*format)(std::int64_t)) {
    return value == 0 ? "none" : format(value);
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    store::Events events(store);
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "events", "size", "limit", "max age", "free", "path", ""}};
    for (const Mount& mount : Mounts(store).List()) {
        const store::MountContent content = events.Content(mount.id);
        const auto folder = maintenance::MountFolder::Open(mount.path, mount.id);
        Json::Value entry = ToData(mount);
        entry["events"] = Json::Int64(content.events);
        entry["size_bytes"] = Json::Int64(content.size_bytes);
        entry["present"] = folder.has_value();
        entry["free_bytes"] = Json::Int64(folder ? folder->Space().free_bytes : 0);
        data.append(entry);
        rows.push_back({std::to_string(mount.id), mount.name, std::to_string(content.events),
                        FormatSize(content.size_bytes), Limit(mount.max_bytes, FormatSize),
                        Limit(mount.max_age_s, FormatDuration),
                        folder ? FormatSize(folder->Space().free_bytes) : "not there", mount.path,
                        std::string(mount.is_default ? "default" : "") + (mount.enabled ? "" : " disabled")});
    }
    console.Answer(Table(rows), data);
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::int64_t events = store::Events(store).Content(request.id).events;
    if (events > 0 && !request.forget) {
        throw Failure(kDataError, "the mount holds " + std::to_string(events) +
                                      " events: with --forget they are forgotten too, while the files stay");
    }
    Mounts(store).Remove(request.id, request.forget);
    Json::Value data;
    data["id"] = request.id;
    data["events_forgotten"] = Json::Int64(events);
    console.Answer("The mount " + std::to_string(request.id) + " is forgotten; its files stay.", data);
}

}  // namespace

void AddMount(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("mount", "Where recordings are kept")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    const auto add_limits = [&](CLI::App* to) {
        to->add_option("--name", request->name, "What it is called");
        to->add_option("--limit", request->limit, "Keep at most so much, such as 500G; 0: as much as the disk takes");
        to->add_option("--max-age", request->max_age, "Keep nothing older, such as 30d; 0: no limit");
        to->add_flag("--default", request->make_default, "Cameras record here that name no mount");
        to->add_flag_function(
            "--enable,!--disable", [request](std::int64_t count) { request->enabled = count > 0; },
            "Whether recordings are written to it");
    };
    CLI::App* add = command("add", "Adds a folder, which must be there", Add);
    add->add_option("path", request->path, "The folder")->required();
    add_limits(add);
    CLI::App* set = command("set", "Changes what is given and leaves the rest", Change);
    set->add_option("id", request->id, "The mount's id")->required();
    set->add_option("--path", request->path, "Where its folder is now");
    add_limits(set);
    group->add_subcommand("list", "Lists the mounts and what they hold")->callback([&console] { List(console); });
    CLI::App* remove = command("remove", "Forgets a mount; its files stay", Remove);
    remove->add_option("id", request->id, "The mount's id")->required();
    remove->add_flag("--forget", request->forget, "Even when it holds events, which are forgotten too");
}

}  // namespace lookhaven::cli
