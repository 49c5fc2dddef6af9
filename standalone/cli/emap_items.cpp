// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/emap_items.h"

#include <optional>
#include <vector>

#include "standalone/admin/emaps.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/table.h"
#include "standalone/emap/item_json.h"

namespace lookhaven::cli {

namespace {

using store::Emap;
using store::EmapItem;
using store::EmapItemType;
using store::Emaps;

const Names<EmapItemType> kTypes = {{"camera", EmapItemType::kCamera},
                                    {"emap", EmapItemType::kEmap},
                                    {"door", EmapItemType::kDoor},
                                    {"io", EmapItemType::kIoModule},
                                    {"pos", EmapItemType::kPos}};

struct Request {
    int emap = 0;
    int number = 0;  // from 1
    EmapItem item;   // of "add"
    std::optional<std::string> name;
    std::optional<int> x, y, direction, text_pos, icon_center_x, icon_center_y, port;
};

void Apply(const Request& request, EmapItem& item) {
    item.name = request.name.value_or(item.name);
    item.x = request.x.value_or(item.x);
    item.y = request.y.value_or(item.y);
    item.direction = request.direction.value_or(item.direction);
    item.text_pos = request.text_pos.value_or(item.text_pos);
    item.icon_center_x = request.icon_center_x.value_or(item.icon_center_x);
    item.icon_center_y = request.icon_center_y.value_or(item.icon_center_y);
    item.port = request.port.value_or(item.port);
}

// Reads the items, lets change edit them and saves them; it returns the answer. Fails when they were changed in
// between.
template <typename ChangeItems>
void Edit(const Console& console, int id, ChangeItems&& change) {
    store::Store store = console.OpenStore();
    Emaps emaps(store);
    Emap emap = RequireEmap(store, id);
    std::vector<EmapItem> items = emaps.Items(id);
    const std::string sentence = change(items);
    try {
        emap.revision = admin::PlaceItems(store, {}, emap, items);
    } catch (const store::Conflict& conflict) {
        throw Failure(kUnavailable, conflict.what(), ": try again");
    }
    console.Answer(Object("id", id, "revision", emap.revision, "items", emap::ToJson(items)), sentence);
}

EmapItem& Numbered(std::vector<EmapItem>& items, int number) {
    if (number < 1 || static_cast<std::size_t>(number) > items.size()) {
        throw Failure(kNoInput, "the e-map has no item ", number, ": see lookhaven emap show");
    }
    return items[static_cast<std::size_t>(number) - 1];
}

void Add(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        EmapItem item = request.item;
        Apply(request, item);
        items.push_back(item);
        return Concat("It is item ", items.size(), " of the e-map.");
    });
}

void Move(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        Apply(request, Numbered(items, request.number));
        return Concat("Changed item ", request.number, ".");
    });
}

void Remove(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        Numbered(items, request.number);
        items.erase(items.begin() + request.number - 1);
        return Concat("Removed item ", request.number, "; the items after it are renumbered.");
    });
}

constexpr Column kColumns[] = {
    {"item", "item"},
    {"type", "type", [](const Json::Value& type) { return NameOf(kTypes, static_cast<EmapItemType>(type.asInt())); }},
    {"id", "id"},
    {"server", "hxId", TextUnlessZero},
    {"port", "portIdx", [](const Json::Value& port) { return port.asInt() < 0 ? "" : PlainText(port); }},
    {"x", "x"},
    {"y", "y"},
    {"direction", "direction"},
    {"name", "name"}};

void AddPlace(Command& command, Request& request) {
    command.Option("--name", request.name, "The name shown beside it")
        .Option("--x", request.x, "Pixels from the picture's left edge")
        .Option("--y", request.y, "Pixels from the picture's upper edge")
        .Option("--direction", request.direction, "Degrees clockwise from up")
        .Option("--text-pos", request.text_pos, "Position of the name: 0 below, 1 above, 2 left, 3 right")
        .Option("--icon-x", request.icon_center_x, "Pixels from the icon's centre to x")
        .Option("--icon-y", request.icon_center_y, "Pixels from the icon's centre to y")
        .Option("--port", request.port, "A port of the device; -1 for the device as a whole");
}

}  // namespace

Emap RequireEmap(store::Store& store, int id) {
    return Require(Emaps(store).Find(id), "there is no e-map ", id, ": see lookhaven emap list");
}

std::string ItemTable(Json::Value items) {
    int number = 0;
    for (Json::Value& item : items) {
        item["item"] = ++number;
    }
    return Table(kColumns, items);
}

void AddEmapItem(CLI::App& emap, const Console& console) {
    CommandGroup<Request> group(emap, console, "item", "The items on an e-map");
    Request& request = group.request();
    const auto add_command = [&](const char* verb, const char* description,
                                 void (*run)(const Console&, const Request&)) {
        return group.Add(verb, description, run).Option("map", request.emap, "The e-map's id", Required);
    };
    const std::string number = "The item's number in emap show";

    Command add = add_command("add", "Places a device", Add)
                      .Option("type", request.item.type, "The type of device", OneOf(kTypes), Required)
                      .Option("id", request.item.device_id, "Its id on its own host", Required)
                      .Option("--server", request.item.server_id, "The paired host that owns it (default: this host)");
    AddPlace(add, request);
    Command move = add_command("move", "Changes the given properties of an item", Move)
                       .Option("item", request.number, number, Required);
    AddPlace(move, request);
    add_command("remove", "Removes an item from the e-map", Remove).Option("item", request.number, number, Required);
}

}  // namespace lookhaven::cli
