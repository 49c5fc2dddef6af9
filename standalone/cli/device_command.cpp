// SPDX-License-Identifier: Apache-2.0
//
// lookhaven door, io, pos: doors, I/O modules and POS terminals.
#include <optional>
#include <regex>

#include "standalone/admin/devices.h"
#include "standalone/base/clock.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/store/devices.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

using store::Device;
using store::Devices;
using store::EmapItemType;

// A kind of device, which is a group of commands.
struct Kind {
    EmapItemType type;
    const char* command;
    const char* name;
    const char* purpose;
    const char* states;  // that can be reported; null where none can
};

constexpr Kind kKinds[] = {
    {EmapItemType::kDoor, "door", "door", "Doors", "open, closed or locked"},
    {EmapItemType::kIoModule, "io", "I/O module", "I/O modules with digital inputs and outputs", "on or off"},
    {EmapItemType::kPos, "pos", "POS terminal", "POS terminals", nullptr}};

struct Request {
    const Kind* kind = nullptr;
    int id = 0;
    std::optional<std::string> name;
    int server = 0;
    int id_on_server = 0;
    std::optional<int> camera;
    std::vector<std::string> ports;
    int port = -1;
    std::string state;
};

// "<index>:in" or "<index>:out", optionally followed by ":<camera>".
void AddPort(const std::string& text, std::map<int, store::Port>& ports) {
    std::smatch parts;
    const bool matches = std::regex_match(text, parts, std::regex("(-?[0-9]+):(in|out)(:(-?[0-9]+))?"));
    const auto index = ParseNumber<int>(parts.str(1));
    const auto camera = ParseNumber<int>(parts[4].matched ? parts.str(4) : "0");
    if (!matches || !index || !camera || ports.contains(*index)) {
        throw Failure(kUsage, "a port is its number and type, such as 0:in, or with its camera 0:in:4");
    }
    ports[*index] = {store::PortTypeNames().at(parts.str(2)), *camera};
}

Json::Value ToData(const Device& device) {
    const auto port_data = [](const auto& numbered) {
        const auto& [number, port] = numbered;
        return Object("port", number, "type", base::NameOf(store::PortTypeNames(), port.type), "camera",
                      port.camera_id);
    };
    return Object("id", device.id, "name", device.name, "server", device.server_id, "id_on_server", device.id_on_server,
                  "camera", device.camera_id, "ports", Array(device.ports, port_data));
}

// As the option --port takes them.
std::string PortsText(const Json::Value& ports) {
    std::string text;
    for (const Json::Value& port : ports) {
        const std::string camera = TextUnlessZero(port["camera"]);
        text += (text.empty() ? "" : " ") + port["port"].asString() + ":" + port["type"].asString() +
                (camera.empty() ? "" : ":" + camera);
    }
    return text;
}

std::string IdOnServerText(const Json::Value& device) {
    return device["server"].asInt() == 0 ? "" : device["id_on_server"].asString();
}

constexpr Column kColumns[] = {{"id", "id"},
                               {"name", "name"},
                               {"server", "server", TextUnlessZero},
                               {"id on server", "", IdOnServerText},
                               {"camera", "camera", TextUnlessZero},
                               {"ports", "ports", PortsText}};

void Edit(const Request& request, Device& device) {
    device.name = request.name.value_or(device.name);
    device.camera_id = request.camera.value_or(device.camera_id);
    if (!request.ports.empty()) {
        device.ports.clear();
        for (const std::string& port : request.ports) {
            AddPort(port, device.ports);
        }
    }
}

void Add(const Console& console, const Request& request) {
    const Kind& kind = *request.kind;
    Device device{.kind = kind.type, .server_id = request.server, .id_on_server = request.id_on_server};
    Edit(request, device);
    store::Store store = console.OpenStore();
    device = admin::AddDevice(store, {}, device);
    console.Answer(ToData(device), "Added ", kind.name, " ", device.name, " with id ", device.id, ".");
}

void Change(const Console& console, const Request& request) {
    const Kind& kind = *request.kind;
    store::Store store = console.OpenStore();
    const Device device =
        admin::SetDevice(store, {}, kind.type, request.id, {}, [&request](Device& edited) { Edit(request, edited); });
    console.Answer(ToData(device), "Changed ", kind.name, " ", device.name, ".");
}

void List(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(Devices(store).List(request.kind->type), ToData);
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    const Kind& kind = *request.kind;
    store::Store store = console.OpenStore();
    admin::RemoveDevice(store, {}, kind.type, request.id, {});
    console.Answer(Object("id", request.id), "Removed ", kind.name, " ", request.id, ".");
}

void Report(const Console& console, const Request& request) {
    const Kind& kind = *request.kind;
    store::Store store = console.OpenStore();
    Devices(store).Report({kind.type, request.id, request.port, request.state, base::WallSeconds()});
    console.Answer(Object("id", request.id, "state", request.state), "Reported ", kind.name, " ", request.id, " as ",
                   request.state, ".");
}

void AddKind(CLI::App& program, const Console& console, const Kind& kind) {
    CommandGroup<Request> group(program, console, kind.command, kind.purpose);
    Request& request = group.request();
    request.kind = &kind;
    const std::string one = std::string("the ") + kind.name;
    const auto add_watchers = [&](Command& command) {
        if (kind.type == EmapItemType::kIoModule) {
            command.Option("--port", request.ports, "A port: 0:in, 1:out, or with its camera 0:in:4; may be repeated",
                           Repeatable);
        } else {
            command.Option("--camera", request.camera, "The camera that watches " + one + "; 0 for none");
        }
    };
    const std::string id = "The id of " + one;
    const std::string name = "The name of " + one;

    Command add = group.Add("add", "Adds a device", Add).Option("name", request.name, name, Required);
    add_watchers(add);
    if (kind.type != EmapItemType::kDoor) {
        add.Option("--server", request.server, "The paired host that owns it (default: this host)")
            .Option("--id-on-server", request.id_on_server, "Its id on that host");
    }
    Command set = group.Add("set", "Changes the given properties of a device", Change)
                      .Option("id", request.id, id, Required)
                      .Option("--name", request.name, name);
    add_watchers(set);
    group.Add("list", "Lists the devices", List);
    group.Add("remove", "Removes a device", Remove).Option("id", request.id, id, Required);
    if (kind.states != nullptr) {
        Command report = group.Add("report", "Reports the state of a device", Report)
                             .Option("id", request.id, id, Required)
                             .Option("state", request.state, kind.states, Required);
        if (kind.type == EmapItemType::kIoModule) {
            report.Option("--port", request.port, "The port's number", Required);
        }
    }
}

}  // namespace

void AddDevices(CLI::App& program, const Console& console) {
    for (const Kind& kind : kKinds) {
        AddKind(program, console, kind);
    }
}

}  // namespace lookhaven::cli
