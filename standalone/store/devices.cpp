// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/devices.h"

#include <algorithm>
#include <array>
#include <set>
#include <string_view>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<Device> {
    static constexpr const char* kTable = "devices";
    static constexpr const char* kColumns = "kind, id, name, server_id, id_on_server, camera_id";
    static auto Members(auto& device) {
        return std::tie(device.kind, device.id, device.name, device.server_id, device.id_on_server, device.camera_id);
    }
};

using PortRow = std::tuple<EmapItemType, int, int, PortType, int>;

template <>
struct Mapping<PortRow> {
    static constexpr const char* kTable = "device_ports";
    static constexpr const char* kColumns = "kind, device_id, port, type, camera_id";
};

template <>
struct Mapping<PortCounts> {
    static auto Members(auto& counts) { return std::tie(counts.inputs, counts.outputs); }
};

using PortCountsRow = std::pair<int, PortCounts>;

template <>
struct Mapping<PortCountsRow> {
    static constexpr const char* kTable = "camera_ports";
    static constexpr const char* kColumns = "camera_id, inputs, outputs";
};

template <>
struct Mapping<DeviceState> {
    static constexpr const char* kTable = "device_states";
    static constexpr const char* kColumns = "kind, device_id, port, state, since_s";
    static auto Members(auto& state) { return std::tie(state.kind, state.id, state.port, state.state, state.since_s); }
};

namespace {

constexpr std::size_t kMaxNameBytes = 64;

// Where its ids come from.
const char* CounterOf(EmapItemType kind) {
    return kind == EmapItemType::kDoor ? "door" : kind == EmapItemType::kIoModule ? "io" : "pos";
}

Device WithPorts(soci::session& sql, Device device) {
    if (device.kind == EmapItemType::kIoModule) {
        for (const auto& [kind, id, index, type, camera] :
             FetchAll<PortRow>(sql, "where kind = :kind and device_id = :id", device.kind, device.id)) {
            device.ports[index] = {type, camera};
        }
    }
    return device;
}

// condition: what narrows the list within its kind.
template <typename... Parameter>
std::vector<Device> FetchDevices(soci::session& sql, const std::string& condition, EmapItemType kind,
                                 const Parameter&... parameters) {
    std::vector<Device> devices =
        FetchAll<Device>(sql, "where kind = :kind" + condition + " order by id", kind, parameters...);
    for (Device& device : devices) {
        device = WithPorts(sql, std::move(device));
    }
    return devices;
}

template <typename... Parameter>
std::optional<Device> FetchDevice(soci::session& sql, const std::string& condition, EmapItemType kind,
                                  const Parameter&... parameters) {
    std::vector<Device> found = FetchDevices(sql, condition, kind, parameters...);
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

constexpr const char* kWithId = " and id = :id";
constexpr const char* kOnServer = " and server_id = :server and id_on_server = :there";

Device RequireDevice(soci::session& sql, EmapItemType kind, int id) {
    return Require(FetchDevice(sql, kWithId, kind, id), DeviceKindText(kind), id);
}

// A camera of this host or of a paired one.
void RequireAnyCamera(soci::session& sql, int id) {
    const char* query = "select id from cameras where id = :id union select id from remote_cameras where id = :remote";
    Require(FetchOne<int>(sql, query, id, id), "camera", id);
}

// All cameras that a device names.
std::set<int> PairedCameras(const Device& device) {
    std::set<int> cameras = {device.camera_id};
    for (const auto& [index, port] : device.ports) {
        cameras.insert(port.camera_id);
    }
    return cameras;
}

// before: the device as it was. What it named already may have been removed since.
void RequirePairedCameras(soci::session& sql, const Device& device, const Device& before = {}) {
    const std::set<int> known = PairedCameras(before);
    for (const int camera : PairedCameras(device)) {
        if (camera != 0 && !known.contains(camera)) {
            RequireAnyCamera(sql, camera);
        }
    }
}

void RequireValid(const Device& device) {
    const std::string kind = DeviceKindText(device.kind);
    if (device.name.empty() || !IsPlainText(device.name, kMaxNameBytes)) {
        throw InvalidRecord("the name of a " + kind + " is 1 to 64 bytes of UTF-8 without control characters");
    }
    if (device.kind != EmapItemType::kIoModule && !device.ports.empty()) {
        throw InvalidRecord("a " + kind + " has no ports");
    }
    if (device.kind == EmapItemType::kDoor && device.server_id != 0) {
        throw InvalidRecord("a door is this host's own");
    }
    if (device.server_id != 0 && device.id_on_server < 1) {
        throw InvalidRecord("a device's id on its host is a number from 1");
    }
    for (const auto& [index, port] : device.ports) {
        if (index < 0 || index >= kMaxPorts || (port.type != PortType::kInput && port.type != PortType::kOutput)) {
            throw InvalidRecord("an I/O module has up to 64 ports, numbered from 0, each an input or an output");
        }
    }
}

void ReplacePorts(soci::session& sql, const Device& device) {
    Execute(sql, "delete from device_ports where kind = :kind and device_id = :id", device.kind, device.id);
    for (const auto& [index, port] : device.ports) {
        Insert(sql, PortRow(device.kind, device.id, index, port.type, port.camera_id));
    }
}

bool IsStateOf(EmapItemType kind, std::string_view state) {
    constexpr std::array<std::string_view, 3> kDoorStates = {"open", "closed", "locked"};
    constexpr std::array<std::string_view, 2> kPortStates = {"on", "off"};
    return kind == EmapItemType::kDoor ? std::ranges::count(kDoorStates, state) > 0
                                       : std::ranges::count(kPortStates, state) > 0;
}

}  // namespace

std::string DeviceKindText(EmapItemType kind) {
    switch (kind) {
    case EmapItemType::kDoor:
        return "door";
    case EmapItemType::kIoModule:
        return "I/O module";
    case EmapItemType::kPos:
        return "POS terminal";
    default:
        throw InvalidRecord("a device is a door, an I/O module or a POS terminal");
    }
}

int Devices::Add(const Device& device) {
    RequireValid(device);
    return connection_.Write([&](soci::session& sql) {
        Device added = device;
        added.id = NextId(sql, CounterOf(device.kind));
        if (added.server_id == 0) {
            added.id_on_server = added.id;
        } else {
            Require(FetchOne<int>(sql, "select id from servers where id = :id", added.server_id), "paired host",
                    added.server_id);
            if (FetchDevice(sql, kOnServer, added.kind, added.server_id, added.id_on_server)) {
                throw AlreadyExists("this " + DeviceKindText(device.kind) + " of the paired host is known already");
            }
        }
        RequirePairedCameras(sql, added);
        Insert(sql, added);
        ReplacePorts(sql, added);
        RaiseRevision(sql);
        return added.id;
    });
}

void Devices::Update(const Device& device) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        const Device before = RequireDevice(sql, device.kind, device.id);
        Device changed = before;
        changed.name = device.name;
        changed.camera_id = device.camera_id;
        changed.ports = device.ports;
        RequireValid(changed);
        RequirePairedCameras(sql, changed, before);
        Execute(sql, "update devices set name = :name, camera_id = :camera where kind = :kind and id = :id",
                changed.name, changed.camera_id, changed.kind, changed.id);
        ReplacePorts(sql, changed);
    });
}

void Devices::Remove(EmapItemType kind, int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireDevice(sql, kind, id);
        Execute(sql, "delete from devices where kind = :kind and id = :id", kind, id);
    });
}

std::optional<Device> Devices::Find(EmapItemType kind, int id) {
    return connection_.Read([&](soci::session& sql) { return FetchDevice(sql, kWithId, kind, id); });
}

std::optional<Device> Devices::FindOnServer(EmapItemType kind, int server_id, int id_on_server) {
    return connection_.Read(
        [&](soci::session& sql) { return FetchDevice(sql, kOnServer, kind, server_id, id_on_server); });
}

std::vector<Device> Devices::List(EmapItemType kind) {
    return connection_.Read([&](soci::session& sql) { return FetchDevices(sql, "", kind); });
}

void Devices::SetCameraPorts(int camera_id, PortCounts counts) {
    if (counts.inputs < 0 || counts.outputs < 0 || counts.inputs > kMaxPorts || counts.outputs > kMaxPorts) {
        throw InvalidRecord("a camera has 0 to 64 inputs and 0 to 64 outputs");
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireAnyCamera(sql, camera_id);
        Execute(sql, "delete from camera_ports where camera_id = :id", camera_id);
        if (counts.inputs + counts.outputs > 0) {
            Insert(sql, PortCountsRow(camera_id, counts));
        }
    });
}

std::map<int, PortCounts> Devices::CameraPorts() {
    return connection_.FetchAll<PortCountsRow, std::map<int, PortCounts>>("");
}

void Devices::Report(const DeviceState& state) {
    connection_.Write(
        [&](soci::session& sql) {
            const Device device = RequireDevice(sql, state.kind, state.id);
            const bool is_door = state.kind == EmapItemType::kDoor;
            if (is_door ? state.port != -1 : !device.ports.contains(state.port)) {
                throw NotFound("the " + DeviceKindText(state.kind) + " " + std::to_string(state.id) + " has no port " +
                               std::to_string(state.port));
            }
            if (!IsStateOf(state.kind, state.state)) {
                throw InvalidRecord("a door is open, closed or locked, a port is on or off");
            }
            Execute(sql,
                    "insert into device_states (kind, device_id, port, state, since_s)"
                    " values (:kind, :id, :port, :state, :since) on conflict (kind, device_id, port)"
                    " do update set state = excluded.state, since_s = excluded.since_s"
                    " where device_states.state <> excluded.state",
                    state.kind, state.id, state.port, state.state, state.since_s);
        },
        Durability::kLazy);
}

std::vector<DeviceState> Devices::States() {
    return connection_.FetchAll<DeviceState>("order by kind, device_id, port");
}

}  // namespace lookhaven::store
