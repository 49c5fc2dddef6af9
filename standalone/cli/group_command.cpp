// SPDX-License-Identifier: Apache-2.0
//
// lookhaven group: cameras that are viewed, searched and denied together.
#include <functional>
#include <optional>

#include "standalone/admin/groups.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
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

Json::Value ToData(const CameraGroup& group) {
    return Object("id", group.id, "name", group.name, "cameras", Array(group.camera_ids, std::identity()));
}

constexpr Column kColumns[] = {{"id", "id"}, {"name", "name"}, {"cameras", "cameras"}};

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const CameraGroup group =
        admin::AddGroup(store, {}, {0, request.name.value_or(""), {request.add.begin(), request.add.end()}});
    console.Answer(ToData(group), "Added group ", group.name, " with id ", group.id, ".");
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const CameraGroup group = admin::SetGroup(store, {}, request.id, {}, [&request](CameraGroup& edited) {
        edited.name = request.name.value_or(edited.name);
        edited.camera_ids.insert(request.add.begin(), request.add.end());
        for (const int camera : request.drop) {
            edited.camera_ids.erase(camera);
        }
    });
    const Json::Value data = ToData(group);
    console.Answer(data, "Group ", group.name, " has the cameras ", PlainText(data["cameras"]), ".");
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(Groups(store).List(), ToData);
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::RemoveGroup(store, {}, request.id, {});
    console.Answer(Object("id", request.id), "Removed group ", request.id, "; its cameras are kept.");
}

}  // namespace

void AddGroup(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "group", "Groups of cameras");
    Request& request = group.request();
    const std::string id = "The group's id";
    const std::string name = "The group's name";
    group.Add("add", "Adds a group", Add)
        .Option("name", request.name, name, Required)
        .Option("--camera", request.add, "A camera's id; may be repeated", Repeatable);
    group.Add("set", "Changes the given properties of a group", Change)
        .Option("id", request.id, id, Required)
        .Option("--name", request.name, name)
        .Option("--add", request.add, "A camera to add to the group; may be repeated", Repeatable)
        .Option("--drop", request.drop, "A camera to remove from the group; may be repeated", Repeatable);
    group.Add("list", "Lists the groups", List);
    group.Add("remove", "Removes a group; its cameras are kept", Remove).Option("id", request.id, id, Required);
}

}  // namespace lookhaven::cli
