// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Device: doors, I/O modules and POS terminals as a manager sets them up.
#include "standalone/api/own_apis.h"

#include "standalone/admin/devices.h"
#include "standalone/api/fields.h"
#include "standalone/api/revision.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

using store::Device;
using store::EmapItemType;

EmapItemType KindOf(const Call& call) {
    const Json::Value& kind = call.Parameter("kind");
    if (kind.isNull()) {
        throw Failure(400, "kind is missing");
    }
    EmapItemType type{};
    TakeNamed(kind, "kind", store::DeviceKindNames(), type);
    return type;
}

// What the call does not name stays.
void TakeDeviceFields(const Call& call, Device& device) {
    TakeField(call, "name", device.name);
    TakeField(call, "camera", device.camera_id);
    const Json::Value& ports = call.Parameter("port");
    if (ports.isNull()) {
        return;
    }
    if (!ports.isArray()) {
        throw Failure(400, "port must be a list");
    }
    device.ports.clear();
    for (const Json::Value& port : ports) {
        if (!port.isObject() || !port["port"].isInt()) {
            throw Failure(400, "each port must be an object with its number as port");
        }
        store::Port taken;
        TakeNamed(port["type"], "port.type", store::PortTypeNames(), taken.type);
        Take(port["camera"], "port.camera", taken.camera_id);
        if (port["type"].isNull() || !device.ports.emplace(port["port"].asInt(), taken).second) {
            throw Failure(400, "each port must be listed once, with its type");
        }
    }
}

std::string AnswerRecord(const Device& device) {
    Json::Value data;
    data["device"] = admin::DeviceRecord(device);
    return SuccessAnswer(data);
}

std::string List(const Call& call) {
    Json::Value data;
    data["device"] = Json::arrayValue;
    store::Devices devices(call.Records());
    for (const auto& [name, kind] : store::DeviceKindNames()) {
        for (const Device& device : devices.List(kind)) {
            data["device"].append(admin::DeviceRecord(device));
        }
    }
    return SuccessAnswer(data);
}

std::string Add(const Call& call) {
    Device device{.kind = KindOf(call)};
    TakeDeviceFields(call, device);
    TakeField(call, "server", device.server_id);
    TakeField(call, "idOnServer", device.id_on_server);
    return AnswerRecord(admin::AddDevice(call.Records(), call.Actor(), device));
}

std::string Set(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    return AnswerRecord(admin::SetDevice(call.Records(), call.Actor(), KindOf(call), IdIn(call, "id"), seen,
                                         [&call](Device& device) { TakeDeviceFields(call, device); }));
}

std::string Remove(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    admin::RemoveDevice(call.Records(), call.Actor(), KindOf(call), IdIn(call, "id"), seen);
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kPostOnly, kManagers},
                               {"Add", Add, kPostOnly, kManagers},
                               {"Set", Set, kPostOnly, kManagers},
                               {"Remove", Remove, kPostOnly, kManagers}};

}  // namespace

const OwnApi kDeviceApi{"VEXO.Device", kMethods};

}  // namespace lookhaven::api
