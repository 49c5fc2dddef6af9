// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/devices.h"

#include <algorithm>
#include <array>
#include <limits>
#include <string_view>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 64;
constexpr int kAny = -1;

// What the sentences call a device, and where its ids come from.
struct Kind {
    const char* name;
    const char* counter;
};

Kind KindOf(EmapItemType kind) {
    switch (kind) {
    case EmapItemType::kDoor:
        return {"door", "door"};
    case EmapItemType::kIoModule:
        return {"I/O module", "io"};
    case EmapItemType::kPos:
        return {"POS terminal", "pos"};
    default:
        throw InvalidRecord("a device is a door, an I/O module or a POS terminal");
    }
}

// id, server and id_on_server narrow the list where they are not kAny.
std::vector<Device> Fetch(soci::session& sql, EmapItemType kind, int id, int server, int id_on_server) {
    const int number = static_cast<int>(kind);
    Device device;
    device.kind = kind;
    soci::statement rows =
        (sql.prepare << "select id, name, server_id, id_on_server, camera_id from devices where kind = :kind"
                        " and (:any_id = -1 or id = :id) and (:any_server = -1 or server_id = :server)"
                        " and (:any_there = -1 or id_on_server = :there) order by id",
         soci::use(number, "kind"), soci::use(id, "any_id"), soci::use(id, "id"), soci::use(server, "any_server"),
         soci::use(server, "server"), soci::use(id_on_server, "any_there"), soci::use(id_on_server, "there"),
         soci::into(device.id), soci::into(device.name), soci::into(device.server_id), soci::into(device.id_on_server),
         soci::into(device.camera_id));
    rows.execute();
    std::vector<Device> devices;
    while (rows.fetch()) {
        devices.push_back(device);
    }
    return devices;
}

void FetchPorts(soci::session& sql, Device& device) {
    const int kind = static_cast<int>(device.kind);
    int index = 0;
    int type = 0;
    int camera = 0;
    soci::statement rows =
        (sql.prepare << "select port, type, camera_id from device_ports where kind = :kind"
                        " and device_id = :id order by port",
         soci::use(kind, "kind"), soci::use(device.id, "id"), soci::into(index), soci::into(type), soci::into(camera));
    rows.execute();
    while (rows.fetch()) {
        device.ports[index] = {static_cast<PortType>(type), camera};
    }
}

std::vector<Device> FetchWhole(soci::session& sql, EmapItemType kind, int id, int server, int id_on_server) {
    std::vector<Device> devices = Fetch(sql, kind, id, server, id_on_server);
    for (Device& device : devices) {
        FetchPorts(sql, device);
    }
    return devices;
}

Device Require(soci::session& sql, EmapItemType kind, int id) {
    std::vector<Device> found = FetchWhole(sql, kind, id, kAny, kAny);
    if (found.empty()) {
        throw NotFound(std::string("there is no ") + KindOf(kind).name + " " + std::to_string(id));
    }
    return std::move(found.front());
}

void RequireCamera(soci::session& sql, int id) {
    int found = 0;
    sql << "select id from cameras where id = :id union select id from remote_cameras where id = :remote",
        soci::use(id, "id"), soci::use(id, "remote"), soci::into(found);
    if (!sql.got_data()) {
        throw NotFound("there is no camera " + std::to_string(id));
    }
}

void RequirePairedCamera(soci::session& sql, int id) {
    if (id != 0) {
        RequireCamera(sql, id);
    }
}

void RequireValid(const Device& device) {
    const Kind kind = KindOf(device.kind);
    if (device.name.empty() || !IsPlainText(device.name, kMaxNameBytes)) {
        throw InvalidRecord(std::string("the name of a ") + kind.name +
                            " is 1 to 64 bytes of UTF-8 without control characters");
    }
    if (device.kind != EmapItemType::kIoModule && !device.ports.empty()) {
        throw InvalidRecord(std::string("a ") + kind.name + " has no ports");
    }
    if (device.kind == EmapItemType::kDoor && device.server_id != 0) {
        throw InvalidRecord("a door is this host's own");
    }
    if (device.server_id != 0 && device.id_on_server < 1) {
        throw InvalidRecord("a device's id on its server is a number from 1");
    }
    for (const auto& [index, port] : device.ports) {
        if (index < 0 || index >= kMaxPorts || (port.type != PortType::kInput && port.type != PortType::kOutput)) {
            throw InvalidRecord("an I/O module has up to 64 ports, numbered from 0, each an input or an output");
        }
    }
}

void RequireServer(soci::session& sql, int id) {
    int found = 0;
    sql << "select id from servers where id = :id", soci::use(id, "id"), soci::into(found);
    if (!sql.got_data()) {
        throw NotFound("there is no server " + std::to_string(id));
    }
}

void ReplacePorts(soci::session& sql, const Device& device) {
    const int kind = static_cast<int>(device.kind);
    sql << "delete from device_ports where kind = :kind and device_id = :id", soci::use(kind, "kind"),
        soci::use(device.id, "id");
    for (const auto& [index, port] : device.ports) {
        RequirePairedCamera(sql, port.camera_id);
        const int type = static_cast<int>(port.type);
        sql << "insert into device_ports (kind, device_id, port, type, camera_id)"
               " values (:kind, :id, :port, :type, :camera)",
            soci::use(kind, "kind"), soci::use(device.id, "id"), soci::use(index, "port"), soci::use(type, "type"),
            soci::use(port.camera_id, "camera");
    }
}

bool IsStateOf(EmapItemType kind, std::string_view state) {
    constexpr std::array<std::string_view, 3> kDoorStates = {"open", "closed", "locked"};
    constexpr std::array<std::string_view, 2> kPortStates = {"on", "off"};
    return kind == EmapItemType::kDoor ? std::ranges::count(kDoorStates, state) > 0
                                       : std::ranges::count(kPortStates, state) > 0;
}

}  // namespace

int Devices::Add(const Device& device) {
    RequireValid(device);
    return connection_.Write([&](soci::session& sql) {
        Device added = device;
        added.id = NextId(sql, KindOf(device.kind).counter);
        if (added.server_id == 0) {
            added.id_on_server = added.id;
        } else {
            RequireServer(sql, added.server_id);
            if (!Fetch(sql, added.kind, kAny, added.server_id, added.id_on_server).empty()) {
                throw AlreadyExists(std::string("this ") + KindOf(device.kind).name +
                                    " of the server is known already");
            }
        }
        RequirePairedCamera(sql, added.camera_id);
        const int kind = static_cast<int>(added.kind);
        sql << "insert into devices (kind, id, name, server_id, id_on_server, camera_id)"
               " values (:kind, :id, :name, :server, :there, :camera)",
            soci::use(kind, "kind"), soci::use(added.id, "id"), soci::use(added.name, "name"),
            soci::use(added.server_id, "server"), soci::use(added.id_on_server, "there"),
            soci::use(added.camera_id, "camera");
        ReplacePorts(sql, added);
        RaiseRevision(sql);
        return added.id;
    });
}

void Devices::Update(const Device& device) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Device changed = Require(sql, device.kind, device.id);
        changed.name = device.name;
        changed.camera_id = device.camera_id;
        changed.ports = device.ports;
        RequireValid(changed);
        RequirePairedCamera(sql, changed.camera_id);
        const int kind = static_cast<int>(changed.kind);
        sql << "update devices set name = :name, camera_id = :camera where kind = :kind and id = :id",
            soci::use(changed.name, "name"), soci::use(changed.camera_id, "camera"), soci::use(kind, "kind"),
            soci::use(changed.id, "id");
        ReplacePorts(sql, changed);
    });
}

void Devices::Remove(EmapItemType kind, int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, kind, id);
        const int number = static_cast<int>(kind);
        sql << "delete from devices where kind = :kind and id = :id", soci::use(number, "kind"), soci::use(id, "id");
    });
}

std::optional<Device> Devices::Find(EmapItemType kind, int id) {
    std::vector<Device> found =
        connection_.Read([&](soci::session& sql) { return FetchWhole(sql, kind, id, kAny, kAny); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::optional<Device> Devices::FindOnServer(EmapItemType kind, int server_id, int id_on_server) {
    std::vector<Device> found =
        connection_.Read([&](soci::session& sql) { return FetchWhole(sql, kind, kAny, server_id, id_on_server); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<Device> Devices::List(EmapItemType kind) {
    return connection_.Read([&](soci::session& sql) { return FetchWhole(sql, kind, kAny, kAny, kAny); });
}

void Devices::SetCameraPorts(int camera_id, PortCounts counts) {
    if (counts.inputs < 0 || counts.outputs < 0 || counts.inputs > kMaxPorts || counts.outputs > kMaxPorts) {
        throw InvalidRecord("a camera has 0 to 64 inputs and 0 to 64 outputs");
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCamera(sql, camera_id);
        sql << "delete from camera_ports where camera_id = :id", soci::use(camera_id, "id");
        if (counts.inputs + counts.outputs > 0) {
            sql << "insert into camera_ports (camera_id, inputs, outputs) values (:id, :inputs, :outputs)",
                soci::use(camera_id, "id"), soci::use(counts.inputs, "inputs"), soci::use(counts.outputs, "outputs");
        }
    });
}

std::map<int, PortCounts> Devices::CameraPorts() {
    return connection_.Read([](soci::session& sql) {
        std::map<int, PortCounts> ports;
        int camera = 0;
        PortCounts counts;
        soci::statement rows = (sql.prepare << "select camera_id, inputs, outputs from camera_ports",
                                soci::into(camera), soci::into(counts.inputs), soci::into(counts.outputs));
        rows.execute();
        while (rows.fetch()) {
            ports[camera] = counts;
        }
        return ports;
    });
}

void Devices::Report(const DeviceState& state) {
    connection_.Write(
        [&](soci::session& sql) {
            const Device device = Require(sql, state.kind, state.id);
            const bool is_door = state.kind == EmapItemType::kDoor;
            if (is_door ? state.port != -1 : !device.ports.contains(state.port)) {
                throw NotFound(std::string("the ") + KindOf(state.kind).name + " " + std::to_string(state.id) +
                               " has no port " + std::to_string(state.port));
            }
            if (!IsStateOf(state.kind, state.state)) {
                throw InvalidRecord("a door is open, closed or locked, a port is on or off");
            }
            const int kind = static_cast<int>(state.kind);
            const long long since = state.since_s;
            sql << "insert into device_states (kind, device_id, port, state, since_s)"
                   " values (:kind, :id, :port, :state, :since) on conflict (kind, device_id, port)"
                   " do update set state = excluded.state, since_s = excluded.since_s"
                   " where device_states.state <> excluded.state",
                soci::use(kind, "kind"), soci::use(state.id, "id"), soci::use(state.port, "port"),
                soci::use(state.state, "state"), soci::use(since, "since");
        },
        Durability::kLazy);
}

std::vector<DeviceState> Devices::States() {
    return connection_.Read([](soci::session& sql) {
        std::vector<DeviceState> states;
        DeviceState state;
        int kind = 0;
        long long since = 0;
        soci::statement rows = (sql.prepare << "select kind, device_id, port, state, since_s from device_states"
                                               " order by kind, device_id, port",
                                soci::into(kind), soci::into(state.id), soci::into(state.port), soci::into(state.state),
                                soci::into(since));
        rows.execute();
        while (rows.fetch()) {
            state.kind = static_cast<EmapItemType>(kind);
            state.since_s = since;
            states.push_back(state);
        }
        return states;
    });
}

}  // namespace lookhaven::store
