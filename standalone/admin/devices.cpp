// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/devices.h"

#include "standalone/admin/change.h"
#include "standalone/store/cameras.h"
#include "standalone/store/servers.h"
#include "standalone/store/value_names.h"

namespace lookhaven::admin {

namespace {

using store::Device;
using store::Devices;
using store::EmapItemType;

constexpr std::size_t kMaxDevices = 500;  // of a kind

std::string KindName(EmapItemType kind) {
    return base::NameOf(store::DeviceKindNames(), kind);
}

Device RequireDevice(store::Store& store, EmapItemType kind, int id) {
    std::optional<Device> device = Devices(store).Find(kind, id);
    if (!device) {
        throw store::NotFound("there is no " + store::DeviceKindText(kind) + " " + std::to_string(id));
    }
    return *std::move(device);
}

Json::Value PortsRecord(Devices& devices, int camera) {
    const store::PortCounts counts = devices.CameraPorts()[camera];
    Json::Value json;
    json["id"] = camera;
    json["inputs"] = counts.inputs;
    json["outputs"] = counts.outputs;
    return json;
}

// The camera must exist.
std::string CameraName(store::Store& store, int id) {
    const std::optional<store::Camera> camera = store::Cameras(store).Find(id);
    return camera ? camera->name : store::RecordingServers(store).FindCamera(id).value().name;
}

}  // namespace

Json::Value DeviceRecord(const Device& device) {
    Json::Value json;
    json["kind"] = KindName(device.kind);
    json["id"] = device.id;
    json["name"] = device.name;
    json["server"] = device.server_id;
    json["idOnServer"] = device.id_on_server;
    json["camera"] = device.camera_id;
    json["port"] = Json::arrayValue;
    for (const auto& [number, port] : device.ports) {
        Json::Value& each = json["port"].append(Json::objectValue);
        each["port"] = number;
        each["type"] = base::NameOf(store::PortTypeNames(), port.type);
        each["camera"] = port.camera_id;
    }
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

Device AddDevice(store::Store& store, const Actor& actor, const Device& device) {
    Device added;
    Apply(store, actor, [&] {
        if (Devices(store).List(device.kind).size() >= kMaxDevices) {
            throw store::InvalidRecord("there are at most " + std::to_string(kMaxDevices) + " devices of a kind");
        }
        added = RequireDevice(store, device.kind, Devices(store).Add(device));
        return Change{KindName(added.kind) + ".add", Named(added.name, added.id), {}, DeviceRecord(added)};
    });
    return added;
}

Device SetDevice(store::Store& store, const Actor& actor, EmapItemType kind, int id, std::optional<std::int64_t> seen,
                 const std::function<void(Device&)>& edit) {
    Device device;
    Apply(store, actor, [&] {
        const Json::Value before = DeviceRecord(device = RequireDevice(store, kind, id));
        RequireCurrent(before, seen);
        edit(device);
        Devices(store).Update(device);
        device = RequireDevice(store, kind, id);
        return Change{KindName(kind) + ".set", Named(device.name, id), before, DeviceRecord(device)};
    });
    return device;
}

void RemoveDevice(store::Store& store, const Actor& actor, EmapItemType kind, int id,
                  std::optional<std::int64_t> seen) {
    Apply(store, actor, [&] {
        const Device device = RequireDevice(store, kind, id);
        const Json::Value before = DeviceRecord(device);
        RequireCurrent(before, seen);
        Devices(store).Remove(kind, id);
        return Change{KindName(kind) + ".remove", Named(device.name, id), before, {}};
    });
}

void SetCameraPorts(store::Store& store, const Actor& actor, int camera, store::PortCounts counts) {
    Apply(store, actor, [&] {
        Devices devices(store);
        const Json::Value before = PortsRecord(devices, camera);
        devices.SetCameraPorts(camera, counts);
        return Change{"camera.ports", Named(CameraName(store, camera), camera), before, PortsRecord(devices, camera)};
    });
}

}  // namespace lookhaven::admin
