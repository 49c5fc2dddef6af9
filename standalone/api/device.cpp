// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Device: doors, I/O modules and POS terminals as a manager sets them up.
#include "standalone/api/own_apis.h"

#include "standalone/admin/devices.h"
#include "standalone/api/camera_fields.h"
#include "standalone/api/revision.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

using store::Device;
using store::EmapItemType;

// Throws Failure 400, which says what the parameter must be.
template <typename Value>
Value Named(const base::Names<Value>& names, const Json::Value& value, const char* sentence) {
    const auto found = names.find(value.isString() ? value.asString() : "");
    if (found == names.end()) {
        throw Failure(400, sentence);
    }
    return found->second;
}

EmapItemType KindOf(const Call& call) {
    return Named(store::DeviceKindNames(), call.Parameter("kind"), "kind must be door, io or pos");
}

int IdOf(const Call& call) {
    int id = 0;
    TakeField(call, "id", id);
    return id;
}

int NumberIn(const Json::Value& port, const char* name) {
    const Json::Value& value = port[name];
    if (!value.isInt() && !value.isNull()) {
        throw Failure(400, "a port's number and camera must be numbers");
    }
    return value.asInt();
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
        const store::PortType type =
            Named(store::PortTypeNames(), port["type"], "the type of a port must be in or out");
        if (!device.ports.emplace(port["port"].asInt(), store::Port{type, NumberIn(port, "camera")}).second) {
            throw Failure(400, "a port is named twice");
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
    return AnswerRecord(admin::SetDevice(call.Records(), call.Actor(), KindOf(call), IdOf(call), seen,
                                         [&call](Device& device) { TakeDeviceFields(call, device); }));
}

std::string Remove(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    admin::RemoveDevice(call.Records(), call.Actor(), KindOf(call), IdOf(call), seen);
    return SuccessAnswer(Json::objectValue);
}

using enum Method::Effect;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kChanges, kManagers},
                               {"Add", Add, kChanges, kManagers},
                               {"Set", Set, kChanges, kManagers},
                               {"Remove", Remove, kChanges, kManagers}};

}  // namespace

const OwnApi kDeviceApi{"VEXO.Device", kMethods};

}  // namespace lookhaven::api
