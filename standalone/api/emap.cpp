// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Emap: e-maps as a manager sets them up, what their editor needs, and the states of doors and ports.
#include "standalone/api/own_apis.h"

#include <algorithm>

#include "standalone/admin/emaps.h"
#include "standalone/api/emap_setup.h"
#include "standalone/api/named_list.h"
#include "standalone/base/clock.h"
#include "standalone/binding/rights.h"
#include "standalone/emap/item_json.h"
#include "standalone/store/cameras.h"
#include "standalone/store/devices.h"
#include "standalone/store/emaps.h"
#include "standalone/store/servers.h"

namespace lookhaven::api {

namespace {

using store::DeniableItem;
using store::EmapItemType;

store::Emap FindVisible(const Call& call) {
    const int id = call.Parameter("emap").asInt();
    const auto emap = store::Emaps(call.Records()).Find(id);
    if (!emap || !binding::MaySee(DeniableItem::kEmap, id)) {
        throw Failure(404, "there is no such e-map");
    }
    return *emap;
}

std::string Items(const Call& call) {
    const store::Emap emap = FindVisible(call);
    Json::Value data;
    data["id"] = emap.id;
    data["name"] = emap.name;
    data["revision"] = emap.revision;
    data["hideItemName"] = emap.hide_names;
    data["smallItemSize"] = emap.small_items;
    data["items"] = emap::ToJson(store::Emaps(call.Records()).Items(emap.id));
    return SuccessAnswer(data);
}

std::string SaveItems(const Call& call) {
    store::Emap emap = FindVisible(call);
    emap.revision = call.Parameter("revision").asInt();
    if (const Json::Value hide = call.Parameter("hideItemName"); !hide.isNull()) {
        emap.hide_names = hide.asBool();
    }
    if (const Json::Value small = call.Parameter("smallItemSize"); !small.isNull()) {
        emap.small_items = small.asBool();
    }
    Json::Value data;
    data["revision"] =
        admin::PlaceItems(call.Records(), call.Actor(), emap, emap::ItemsFromJson(call.Parameter("items")));
    return SuccessAnswer(data);
}

// server_id: 0 for what is of this host.
template <typename Record>
Json::Value& AppendPlaceable(Json::Value& list, const Record& record, int server_id, int id_on_server) {
    Json::Value& json = AppendNamed(list, record);
    json["hxId"] = server_id;
    json["idOnRec"] = id_on_server;
    return json;
}

Json::Value CameraList(store::Store& records) {
    Json::Value list(Json::arrayValue);
    std::map<int, store::PortCounts> ports = store::Devices(records).CameraPorts();
    const auto append = [&](const auto& camera, int server_id, int id_on_server) {
        Json::Value& json = AppendPlaceable(list, camera, server_id, id_on_server);
        json["inputs"] = ports[camera.id].inputs;
        json["outputs"] = ports[camera.id].outputs;
    };
    for (const store::Camera& camera : store::Cameras(records).List()) {
        append(camera, 0, camera.id);
    }
    for (const store::RemoteCamera& camera : store::RecordingServers(records).ListCameras()) {
        append(camera, camera.server_id, camera.id_on_server);
    }
    return list;
}

Json::Value DeviceList(store::Store& records, EmapItemType kind) {
    Json::Value list(Json::arrayValue);
    for (const store::Device& device : store::Devices(records).List(kind)) {
        Json::Value& json = AppendPlaceable(list, device, device.server_id, device.id_on_server);
        json["camera"] = device.camera_id;
        json["port"] = Json::arrayValue;
        for (const auto& [index, port] : device.ports) {
            Json::Value& described = json["port"].append(Json::objectValue);
            described["idx"] = index;
            described["type"] = static_cast<int>(port.type);
            described["camera"] = port.camera_id;
        }
    }
    return list;
}

// What may be placed on a map.
std::string Devices(const Call& call) {
    store::Store& records = call.Records();
    Json::Value data;
    data["camera"] = CameraList(records);
    data["emap"] = Json::arrayValue;
    for (const store::Emap& emap : store::Emaps(records).List()) {
        AppendPlaceable(data["emap"], emap, 0, emap.id);
    }
    data["door"] = DeviceList(records, EmapItemType::kDoor);
    data["io"] = DeviceList(records, EmapItemType::kIoModule);
    data["pos"] = DeviceList(records, EmapItemType::kPos);
    return SuccessAnswer(data);
}

bool IsOnMap(const std::vector<store::EmapItem>& items, const store::Device& device) {
    return std::any_of(items.begin(), items.end(), [&device](const store::EmapItem& item) {
        return item.type == device.kind && item.server_id == device.server_id && item.device_id == device.id_on_server;
    });
}

// A door, or a port, with its camera as far as the caller may watch it.
void AppendState(Json::Value& list, const store::Device& device, int port, int camera,
                 const std::vector<store::DeviceState>& states) {
    const auto found = std::find_if(states.begin(), states.end(), [&](const store::DeviceState& state) {
        return state.kind == device.kind && state.id == device.id && state.port == port;
    });
    Json::Value& json = list.append(Json::objectValue);
    json["id"] = device.id_on_server;
    json["hxId"] = device.server_id;
    json["portIdx"] = port;
    json["state"] = found == states.end() ? "" : found->state;
    json["since"] = Json::Int64{found == states.end() ? 0 : found->since_s};
    json["camera"] = camera != 0 && binding::MayUse(camera, store::CameraAccess::kLive) ? camera : 0;
}

std::string States(const Call& call) {
    const int emap = FindVisible(call).id;
    const std::vector<store::EmapItem> items = store::Emaps(call.Records()).Items(emap);
    store::Devices devices(call.Records());
    const std::vector<store::DeviceState> states = devices.States();
    Json::Value data;
    data["door"] = data["io"] = Json::arrayValue;
    for (const store::Device& door : devices.List(EmapItemType::kDoor)) {
        if (IsOnMap(items, door) && binding::MaySee(DeniableItem::kDoor, door.id)) {
            AppendState(data["door"], door, -1, door.camera_id, states);
        }
    }
    for (const store::Device& module : devices.List(EmapItemType::kIoModule)) {
        if (IsOnMap(items, module) && binding::MaySee(DeniableItem::kIoModule, module.id)) {
            for (const auto& [index, port] : module.ports) {
                AppendState(data["io"], module, index, port.camera_id, states);
            }
        }
    }
    return SuccessAnswer(data);
}

std::string Report(const Call& call) {
    const Json::Value kind = call.Parameter("kind");
    if (kind != "door" && kind != "io") {
        throw Failure(400, "kind must be door or io");
    }
    const Json::Value port = call.Parameter("portIdx");
    store::Devices(call.Records())
        .Report({kind == "door" ? EmapItemType::kDoor : EmapItemType::kIoModule, call.Parameter("id").asInt(),
                 port.isNull() ? -1 : port.asInt(), call.Parameter("state").asString(), base::WallSeconds()});
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"States", States},
                               {"Items", Items, kGetAndPost, kManagers},
                               {"Devices", Devices, kGetAndPost, kManagers},
                               {"SaveItems", SaveItems, kPostOnly, kManagers},
                               {"Report", Report, kPostOnly, kManagers},
                               {"List", ListEmaps, kPostOnly, kManagers},
                               {"Add", AddEmap, kPostOnly, kManagers},
                               {"Picture", SetEmapPicture, kPostOnly, kManagers},
                               {"Rename", RenameEmap, kPostOnly, kManagers},
                               {"Remove", RemoveEmap, kPostOnly, kManagers},
                               {"MayUpload", MayUpload, kGetAndPost, kManagers}};

}  // namespace

const OwnApi kEmapApi{"VEXO.Emap", kMethods};

}  // namespace lookhaven::api
