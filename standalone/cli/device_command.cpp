// SPDX-License-Identifier: Apache-2.0
//
// lookhaven door, io, pos: doors, I/O modules and POS terminals.
#include <charconv>
#include <memory>
#include <optional>

#include "standalone/base/clock.h"
#include "standalone/cli/commands.h"
#include "standalone/store/devices.h"

namespace lookhaven::cli {

namespace {

using store::Device;
using store::Devices;
using store::EmapItemType;
using store::PortType;

// One of the three groups of commands.
struct Kind {
    EmapItemType type;
    const char* command;
    const char* name;
    const char* purpose;
    const char* states;  // that can be reported; null where none can
};

constexpr Kind kKinds[] = {
    {EmapItemType::kDoor, "door", "door", "Doors", "open, closed or locked"},
    {EmapItemType::kIoModule, "io", "I/O module", "I/O modules: boxes of inputs and outputs", "on or off"},
    {EmapItemType::kPos, "pos", "POS terminal", "POS terminals: tills", nullptr}};

struct Request {
    int id = 0;
    std::optional<std::string> name;
    int server = 0;
    int id_on_server = 0;
    std::optional<int> camera;
    std::vector<std::string> ports;
    int port = -1;
    std::string state;
};

// "<index>:in" or "<index>:out", then perhaps ":<camera>".
void AddPort(const std::string& text, std::map<int, store::Port>& ports) {
    const std::string_view whole = text;
    const std::size_t colon = whole.find(':');
    const std::string_view rest = colon == whole.npos ? "" : whole.substr(colon + 1);
    const std::size_t second = rest.find(':');
    const std::string_view type = rest.substr(0, second);
    const std::string_view camera = second == rest.npos ? "0" : rest.substr(second + 1);
    int index = 0;
    store::Port port;
    const auto is_number = [](std::string_view digits, int& number) {
        const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
        return error == std::errc() && end == digits.data() + digits.size();
    };
    if (!is_number(whole.substr(0, colon), index) || (type != "in" && type != "out") ||
        !is_number(camera, port.camera_id) || ports.contains(index)) {
        throw Failure(kUsage, "a port is given as its number and its type, \"0:in\", or with its camera, \"0:in:4\"");
    }
    port.type = type == "in" ? PortType::kInput : PortType::kOutput;
    ports[index] = port;
}

std::string PortText(const Device& device) {
    std::string text;
    for (const auto& [index, port] : device.ports) {
        text += (text.empty() ? "" : " ") + std::to_string(index) + (port.type == PortType::kInput ? ":in" : ":out") +
                (port.camera_id == 0 ? "" : ":" + std::to_string(port.camera_id));
    }
    return text;
}

Json::Value ToData(const Device& device) {
    Json::Value data;
    data["id"] = device.id;
    data["name"] = device.name;
    data["server"] = device.server_id;
    data["id_on_server"] = device.id_on_server;
    data["camera"] = device.camera_id;
    data["ports"] = Json::arrayValue;
    for (const auto& [index, port] : device.ports) {
        Json::Value& entry = data["ports"].append(Json::objectValue);
        entry["port"] = index;
        entry["type"] = port.type == PortType::kInput ? "in" : "out";
        entry["camera"] = port.camera_id;
    }
    return data;
}

void Apply(const Request& request, Device& device) {
    device.name = request.name.value_or(device.name);
    device.camera_id = request.camera.value_or(device.camera_id);
    if (!request.ports.empty()) {
        device.ports.clear();
        for (const std::string& port : request.ports) {
            AddPort(port, device.ports);
        }
    }
}

void Add(const Console& console, const Kind& kind, const Request& request) {
    Device device{.kind = kind.type, .server_id = request.server, .id_on_server = request.id_on_server};
    Apply(request, device);
    store::Store store = console.OpenStore();
    const int id = Devices(store).Add(device);
    console.Answer("The " + std::string(kind.name) + " " + device.name + " has the id " + std::to_string(id) + ".",
                   ToData(*Devices(store).Find(kind.type, id)));
}

void Change(const Console& console, const Kind& kind, const Request& request) {
    store::Store store = console.OpenStore();
    std::optional<Device> device = Devices(store).Find(kind.type, request.id);
    if (!device) {
        throw store::NotFound(std::string("there is no ") + kind.name + " " + std::to_string(request.id));
    }
    Apply(request, *device);
    Devices(store).Update(*device);
    console.Answer("The " + std::string(kind.name) + " " + device->name + " is changed.", ToData(*device));
}

void List(const Console& console, const Kind& kind, const Request&) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "server", "id there", "camera", "ports"}};
    for (const Device& device : Devices(store).List(kind.type)) {
        data.append(ToData(device));
        const bool remote = device.server_id != 0;
        rows.push_back({std::to_string(device.id), device.name, remote ? std::to_string(device.server_id) : "",
                        remote ? std::to_string(device.id_on_server) : "",
                        device.camera_id == 0 ? "" : std::to_string(device.camera_id), PortText(device)});
    }
    console.Answer(Table(rows), data);
}

void Remove(const Console& console, const Kind& kind, const Request& request) {
    store::Store store = console.OpenStore();
    Devices(store).Remove(kind.type, request.id);
    Json::Value data;
    data["id"] = request.id;
    console.Answer("The " + std::string(kind.name) + " " + std::to_string(request.id) + " is gone.", data);
}

void Report(const Console& console, const Kind& kind, const Request& request) {
    store::Store store = console.OpenStore();
    Devices(store).Report({kind.type, request.id, request.port, request.state, base::WallMillis() / 1000});
    Json::Value data;
    data["id"] = request.id;
    data["state"] = request.state;
    console.Answer("The " + std::string(kind.name) + " " + std::to_string(request.id) + " is " + request.state + ".",
                   data);
}

void AddKind(CLI::App& program, Console& console, const Kind& kind) {
    CLI::App* group = program.add_subcommand(kind.command, kind.purpose)->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose,
                             void (*run)(const Console&, const Kind&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, &kind, request, run] { run(console, kind, *request); });
        return added;
    };
    const auto take_id = [&](CLI::App* taker) { taker->add_option("id", request->id, "Its id")->required(); };
    CLI::App* add = command("add", "Makes one known", Add);
    add->add_option("name", request->name, "What it is called")->required();
    CLI::App* set = command("set", "Changes what is given and leaves the rest", Change);
    take_id(set);
    set->add_option("--name", request->name, "What it is called");
    for (CLI::App* each : {add, set}) {
        if (kind.type == EmapItemType::kIoModule) {
            each->add_option("--port", request->ports,
                             "A port: 0:in, 1:out, or with its camera 0:in:4; may be repeated")
                ->allow_extra_args(false);
        } else {
            each->add_option("--camera", request->camera, "The camera that watches it; 0: none");
        }
    }
    if (kind.type != EmapItemType::kDoor) {
        add->add_option("--server", request->server, "The recording server that owns it (else this host)");
        add->add_option("--id-on-server", request->id_on_server, "Its id there");
    }
    command("list", "Lists them", List);
    take_id(command("remove", "Removes one", Remove));
    if (kind.states != nullptr) {
        CLI::App* report = command("report", "Says what state it is in", Report);
        take_id(report);
        report->add_option("state", request->state, kind.states)->required();
        if (kind.type == EmapItemType::kIoModule) {
            report->add_option("--port", request->port, "The port's number")->required();
        }
    }
}

}  // namespace

void AddDevices(CLI::App& program, Console& console) {
    for (const Kind& kind : kKinds) {
        AddKind(program, console, kind);
    }
}

}  // namespace lookhaven::cli
