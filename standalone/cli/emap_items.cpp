// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/emap_items.h"

#include <algorithm>
#include <memory>
#include <optional>

#include "standalone/cli/commands.h"
#include "standalone/emap/item_json.h"

namespace lookhaven::cli {

namespace {

using store::Emap;
using store::EmapItem;
using store::EmapItemType;
using store::Emaps;

const std::map<std::string, EmapItemType> kTypes = {{"camera", EmapItemType::kCamera},
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

// Takes what was given.
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

// Reads the items, lets change work on them and saves them; someone else's change between is an error.
template <typename ChangeItems>
void Edit(const Console& console, int id, ChangeItems&& change) {
    store::Store store = console.OpenStore();
    Emaps emaps(store);
    Emap emap = RequireEmap(store, id);
    std::vector<EmapItem> items = emaps.Items(id);
    const std::string sentence = change(items);
    try {
        emap.revision = emaps.ReplaceItems(emap, items);
    } catch (const store::Conflict& conflict) {
        throw Failure(kUnavailable, std::string(conflict.what()) + ": try again");
    }
    Json::Value data;
    data["id"] = id;
    data["revision"] = emap.revision;
    data["items"] = emap::ToJson(items);
    console.Answer(sentence, data);
}

EmapItem& Numbered(std::vector<EmapItem>& items, int number) {
    if (number < 1 || static_cast<std::size_t>(number) > items.size()) {
        throw Failure(kNoInput, "the map has no item " + std::to_string(number) + ": lookhaven emap show names them");
    }
    return items[static_cast<std::size_t>(number) - 1];
}

void Add(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        EmapItem item = request.item;
        Apply(request, item);
        items.push_back(item);
        return "It is item " + std::to_string(items.size()) + " of the map.";
    });
}

void Move(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        Apply(request, Numbered(items, request.number));
        return "The item " + std::to_string(request.number) + " is changed.";
    });
}

void Remove(const Console& console, const Request& request) {
    Edit(console, request.emap, [&](std::vector<EmapItem>& items) {
        Numbered(items, request.number);
        items.erase(items.begin() + request.number - 1);
        return "The item " + std::to_string(request.number) + " is off the map; the next ones moved up.";
    });
}

void TakePlace(CLI::App& command, const std::shared_ptr<Request>& request) {
    command.add_option("--name", request->name, "What stands beside it");
    command.add_option("--x", request->x, "Pixels from the picture's left edge");
    command.add_option("--y", request->y, "Pixels from its upper edge");
    command.add_option("--direction", request->direction, "Degrees clockwise from up");
    command.add_option("--text-pos", request->text_pos, "Where its name stands: 0 below, 1 above, 2 left, 3 right");
    command.add_option("--icon-x", request->icon_center_x, "Pixels from the icon's middle to its place");
    command.add_option("--icon-y", request->icon_center_y, "Likewise, downwards");
    command.add_option("--port", request->port, "One of the device's ports; -1: the device as a whole");
}

}  // namespace

Emap RequireEmap(store::Store& store, int id) {
    const std::optional<Emap> emap = Emaps(store).Find(id);
    if (!emap) {
        throw store::NotFound("there is no e-map " + std::to_string(id) + ": lookhaven emap list names them");
    }
    return *emap;
}

Rows ItemRows(const std::vector<EmapItem>& items) {
    Rows rows = {{"item", "type", "id", "server", "port", "x", "y", "direction", "name"}};
    for (const EmapItem& item : items) {
        const auto type = std::ranges::find(kTypes, item.type, [](const auto& entry) { return entry.second; });
        rows.push_back({std::to_string(rows.size()), type->first, std::to_string(item.device_id),
                        item.server_id == 0 ? "" : std::to_string(item.server_id),
                        item.port < 0 ? "" : std::to_string(item.port), std::to_string(item.x), std::to_string(item.y),
                        std::to_string(item.direction), item.name});
    }
    return rows;
}

void AddEmapItem(CLI::App& emap, Console& console) {
    CLI::App* group = emap.add_subcommand("item", "What is placed on a map")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->add_option("map", request->emap, "The map's id")->required();
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    CLI::App* add = command("add", "Places a device", Add);
    Choose(add->add_option("type", request->item.type, "What it is")->required(), kTypes);
    add->add_option("id", request->item.device_id, "Its id on its own server")->required();
    add->add_option("--server", request->item.server_id, "The recording server that owns it (else this host)");
    TakePlace(*add, request);
    CLI::App* move = command("move", "Changes what is given of an item's place and name", Move);
    CLI::App* remove = command("remove", "Takes an item off the map", Remove);
    for (CLI::App* each : {move, remove}) {
        each->add_option("item", request->number, "The item's number, as emap show has it")->required();
    }
    TakePlace(*move, request);
}

}  // namespace lookhaven::cli
