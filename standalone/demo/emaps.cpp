// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/emaps.h"

#include <string>
#include <utility>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/demo/floor_plans.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/devices.h"
#include "standalone/store/emaps.h"
#include "standalone/store/users.h"

namespace lookhaven::demo {

namespace {

using store::Devices;
using store::EmapItem;
using store::EmapItemType;
using store::PortType;

constexpr const char* kFrontDoor = "Front door";
constexpr const char* kBackDoor = "Loading door";
constexpr const char* kPlantRoom = "Plant room";
constexpr const char* kTerminal = "POS terminal";

struct Ids {
    int ground = 0;
    int upper = 0;
    int front_door = 0;
    int back_door = 0;
    int io = 0;
    int pos = 0;
};

Ids AddDevices(store::Store& store, const std::map<std::string, int>& cameras) {
    Devices devices(store);
    Ids ids;
    ids.front_door =
        devices.Add({.kind = EmapItemType::kDoor, .name = kFrontDoor, .camera_id = cameras.at("Entrance")});
    ids.back_door = devices.Add({.kind = EmapItemType::kDoor, .name = kBackDoor});
    ids.io = devices.Add({.kind = EmapItemType::kIoModule,
                          .name = kPlantRoom,
                          .ports = {{0, {PortType::kInput, cameras.at("Parking")}}, {1, {PortType::kOutput, 0}}}});
    ids.pos = devices.Add({.kind = EmapItemType::kPos, .name = kTerminal, .camera_id = cameras.at("Entrance")});
    devices.SetCameraPorts(cameras.at("Entrance"), {1, 1});
    const std::int64_t now_s = base::WallSeconds();
    devices.Report({EmapItemType::kDoor, ids.front_door, -1, "closed", now_s});
    devices.Report({EmapItemType::kDoor, ids.back_door, -1, "locked", now_s});
    devices.Report({EmapItemType::kIoModule, ids.io, 0, "off", now_s});
    devices.Report({EmapItemType::kIoModule, ids.io, 1, "on", now_s});
    return ids;
}

std::vector<EmapItem> GroundFloor(const Ids& ids, const std::map<std::string, int>& cameras) {
    const auto item = [](EmapItemType type, int id, const char* name, int x, int y, int direction = 0, int port = -1) {
        return EmapItem{type, id, name, 0, x, y, direction, 0, 0, 0, port};
    };
    return {item(EmapItemType::kCamera, cameras.at("Entrance"), "Entrance", 560, 620, 20),
            item(EmapItemType::kCamera, cameras.at("Parking"), "Parking", 980, 170, 200),
            item(EmapItemType::kCamera, cameras.at("Entrance"), "Door contact", 460, 600, 0, 0),
            item(EmapItemType::kDoor, ids.front_door, kFrontDoor, 420, 700),
            item(EmapItemType::kDoor, ids.back_door, kBackDoor, 740, 160),
            item(EmapItemType::kIoModule, ids.io, "Smoke alarm", 190, 190, 0, 0),
            item(EmapItemType::kIoModule, ids.io, "Ventilation", 280, 190, 0, 1),
            item(EmapItemType::kPos, ids.pos, kTerminal, 540, 430),
            item(EmapItemType::kEmap, ids.upper, "Upper floor", 220, 590)};
}

std::vector<EmapItem> UpperFloor(const Ids& ids, const std::map<std::string, int>& cameras) {
    return {{.type = EmapItemType::kEmap, .device_id = ids.ground, .name = "Ground floor", .x = 220, .y = 590},
            {.device_id = cameras.at("Warehouse"), .name = "Warehouse", .x = 480, .y = 180, .direction = 140},
            {.device_id = cameras.at("Gate"), .name = "Gate", .x = 930, .y = 600, .direction = 300}};
}

int AddMap(store::Store& store, const std::filesystem::path& home, const char* name, const char* picture) {
    const int id = store::Emaps(store).Add({.name = name});
    store::Emaps(store).SetImage(id, emap::Pictures(store, home).Write(picture));
    return id;
}

void Place(store::Store& store, int map, const std::vector<EmapItem>& items) {
    store::Emaps emaps(store);
    emaps.ReplaceItems(*emaps.Find(map), items);
}

}  // namespace

int AddEmaps(store::Store& store, const std::filesystem::path& home, const std::map<std::string, int>& cameras,
             int viewer) {
    if (!store::Emaps(store).List().empty()) {
        return 0;
    }
    Ids ids = AddDevices(store, cameras);
    ids.ground = AddMap(store, home, "Ground floor", kGroundFloorPlan);
    ids.upper = AddMap(store, home, "Upper floor", kUpperFloorPlan);
    Place(store, ids.ground, GroundFloor(ids, cameras));
    Place(store, ids.upper, UpperFloor(ids, cameras));
    store::Users(store).DenyItem(viewer, store::DeniableItem::kDoor, ids.back_door);
    return 2;
}

int RemoveEmaps(store::Store& store, const std::filesystem::path& home, const std::set<int>& cameras) {
    store::Emaps emaps(store);
    emap::Pictures pictures(store, home);
    int removed = 0;
    for (const store::EmapSummary& map : emaps.List()) {
        if (const std::string picture = map.image.empty() ? "" : pictures.Read(map.image);
            picture == kGroundFloorPlan || picture == kUpperFloorPlan) {
            emaps.Remove(map.id);
            ++removed;
        }
    }
    Devices devices(store);
    for (const auto& [kind, name] : {std::pair(EmapItemType::kDoor, kFrontDoor),
                                     {EmapItemType::kDoor, kBackDoor},
                                     {EmapItemType::kIoModule, kPlantRoom},
                                     {EmapItemType::kPos, kTerminal}}) {
        for (const store::Device& device : devices.List(kind)) {
            if (device.name == name && (device.camera_id == 0 || cameras.contains(device.camera_id))) {
                devices.Remove(kind, device.id);
            }
        }
    }
    pictures.Sweep();
    return removed;
}

}  // namespace lookhaven::demo
