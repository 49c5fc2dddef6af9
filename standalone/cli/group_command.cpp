// SPDX-License-Identifier: Apache-2.0
//
// lookhaven group: cameras that are looked at, searched and denied together.
#include <memory>
#include <optional>

#include "standalone/cli/commands.h"
#include "standalone/store/groups.h"

namespace lookhaven::cli {

namespace {

using store::CameraGroup;
using store::Groups;

struct Request {
    int id = 0;
    std::optional<std::string> name;
    std::vector<int> add;
    std::vector<int> drop;
};

std::string Ids(const CameraGroup& group) {
    std::string ids;
    for (const int camera : group.camera_ids) {
        ids += (ids.empty() ? "" : " ") + std::to_string(camera);
    }
    return ids;
}

Json::Value ToData(const CameraGroup& group) {
    Json::Value data;
    data["id"] = group.id;
    data["name"] = group.name;
    data["cameras"] = Json::arrayValue;
    for (const int camera : group.camera_ids) {
        data["cameras"].append(camera);
    }
    return data;
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    CameraGroup group{0, request.name.value_or(""), {request.add.begin(), request.add.end()}};
    group.id = Groups(store).Add(group);
    console.Answer("The group " + group.name + " has the id " + std::to_string(group.id) + ".", ToData(group));
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    std::optional<CameraGroup> group = Groups(store).Find(request.id);
    if (!group) {
        throw store::NotFound("there is no camera group " + std::to_string(request.id));
    }
    group->name = request.name.value_or(group->name);
    group->camera_ids.insert(request.add.begin(), request.add.end());
    for (const int camera : request.drop) {
        group->camera_ids.erase(camera);
    }
    Groups(store).Update(*group);
    console.Answer("The group " + group->name + " has the cameras " + Ids(*group) + ".", ToData(*group));
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "cameras"}};
    for (const CameraGroup& group : Groups(store).List()) {
        data.append(ToData(group));
        rows.push_back({std::to_string(group.id), group.name, Ids(group)});
    }
    console.Answer(Table(rows), data);
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Groups(store).Remove(request.id);
    Json::Value data;
    data["id"] = request.id;
    console.Answer("The group " + std::to_string(request.id) + " is gone; its cameras stay.", data);
}

}  // namespace

void AddGroup(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("group", "Groups of cameras")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    CLI::App* add = command("add", "Makes a group", Add);
    add->add_option("name", request->name, "What it is called")->required();
    add->add_option("--camera", request->add, "A camera's id; may be repeated")->allow_extra_args(false);
    CLI::App* set = command("set", "Changes what is given and leaves the rest", Change);
    set->add_option("id", request->id, "The group's id")->required();
    set->add_option("--name", request->name, "What it is called");
    set->add_option("--add", request->add, "A camera to take in; may be repeated")->allow_extra_args(false);
    set->add_option("--drop", request->drop, "A camera to leave out; may be repeated")->allow_extra_args(false);
    group->add_subcommand("list", "Lists the groups")->callback([&console] { List(console); });
    command("remove", "Removes a group; its cameras stay", Remove)
        ->add_option("id", request->id, "The group's id")
        ->required();
}

}  // namespace lookhaven::cli
