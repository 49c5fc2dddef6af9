// SPDX-License-Identifier: Apache-2.0
//
// lookhaven server, set: hosts that show each other's cameras.
//
// Why so        Pairing takes one line of text, which a person carries from the host that has the cameras to the one that is
//               to show them: it names the host, its certificate, its cameras and a secret of those two alone.
#include <iostream>
#include <memory>
#include <optional>

#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/cli/certificate.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/pair_text.h"
#include "standalone/cli/relay_config.h"
#include "standalone/store/secret.h"
#include "standalone/store/servers.h"
#include "standalone/store/settings.h"

namespace lookhaven::cli {

namespace {

using store::RecordingServer;
using store::RecordingServers;
using store::RemoteCamera;

constexpr int kDefaultPort = 8443;
constexpr std::size_t kSecretBytes = 32;

struct Request {
    int id = 0;
    std::string name;
    std::string address;
    int port = kDefaultPort;
    std::string cms;
};

Json::Value ToData(const RecordingServer& server) {
    Json::Value data;
    data["id"] = server.id;
    data["name"] = server.name;
    data["address"] = server.address;
    data["port"] = server.port;
    data["enabled"] = server.enabled;
    return data;
}

std::string HostName() {
    char name[256] = "";
    ::gethostname(name, sizeof name - 1);
    return name;
}

std::vector<RemoteCamera> OwnCameras(store::Store& store) {
    std::vector<RemoteCamera> cameras;
    for (const store::Camera& camera : store::Cameras(store).List()) {
        cameras.push_back(
            {.id_on_server = camera.id, .name = camera.name, .video_type = camera.video_type, .audio = camera.audio});
    }
    return cameras;
}

// The text alone goes to standard output, so that it can be sent on as it is.
void Pair(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::string certificate =
        CertificatesIn(base::ReadFile(console.Installation().TlsFolder() / "certificate.pem"));
    const PairOffer offer{request.address.empty() ? HostName() : request.address, request.port, certificate,
                          store::RandomHex(kSecretBytes), OwnCameras(store)};
    RecordingServer watcher;
    watcher.name = request.name;
    watcher.id = RecordingServers(store).Add(watcher, offer.secret);
    Json::Value data = ToData(watcher);
    data["text"] = ToText(offer);
    console.Answer(ToText(offer), data);
    if (!console.json) {
        std::cerr << "Give this line to \"lookhaven server add\" on " << watcher.name
                  << ", which may then show every camera of this host. Whoever has it may, so keep it secret.\n";
    }
}

std::string ReadPairText() {
    if (::isatty(STDIN_FILENO) != 0) {
        std::cerr << "The line that lookhaven server pair wrote on the other host: ";
    }
    std::string line;
    std::getline(std::cin, line);
    return line;
}

void Add(const Console& console, const Request& request) {
    const PairOffer offer = ParsePairText(ReadPairText());
    CertificateName(offer.certificate);  // refused here, before the web server would be
    store::Store store = console.OpenStore();
    RecordingServers servers(store);
    RecordingServer server{.name = request.name,
                           .address = request.address.empty() ? offer.address : request.address,
                           .port = offer.port,
                           .certificate = CertificatesIn(offer.certificate)};
    server.id = servers.Add(server, offer.secret);
    try {
        for (RemoteCamera camera : offer.cameras) {
            camera.server_id = server.id;
            servers.PutCamera(camera);
        }
        WriteRelayConfig(console.Installation(), servers.List());
    } catch (...) {
        servers.Remove(server.id);
        throw;
    }
    console.Answer("The server " + server.name + " has the id " + std::to_string(server.id) + ", and " +
                       std::to_string(offer.cameras.size()) + " cameras.",
                   ToData(server));
}

void List(const Console& console, const Request&) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "address", "port"}};
    for (const RecordingServer& server : RecordingServers(store).List()) {
        data.append(ToData(server));
        rows.push_back({std::to_string(server.id), server.name, server.address.empty() ? "asks only" : server.address,
                        server.address.empty() ? "" : std::to_string(server.port)});
    }
    console.Answer(Table(rows), data);
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    RecordingServers servers(store);
    servers.Remove(request.id);
    WriteRelayConfig(console.Installation(), servers.List());
    Json::Value data;
    data["id"] = request.id;
    console.Answer("The server " + std::to_string(request.id) + " is gone, and what was known of its cameras.", data);
}

void ListCameras(const Console& console, const Request&) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "server", "id there"}};
    for (const RemoteCamera& camera : RecordingServers(store).ListCameras()) {
        Json::Value& entry = data.append(Json::objectValue);
        entry["id"] = camera.id;
        entry["name"] = camera.name;
        entry["server"] = camera.server_id;
        entry["id_on_server"] = camera.id_on_server;
        rows.push_back({std::to_string(camera.id), camera.name, std::to_string(camera.server_id),
                        std::to_string(camera.id_on_server)});
    }
    console.Answer(Table(rows), data);
}

// For a start of the web server: its part as the store has it.
void Configure(const Console& console, const Request&) {
    store::Store store = console.OpenStore();
    WriteRelayConfig(console.Installation(), RecordingServers(store).List());
}

void SetCms(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    store::Settings(store).Set("cms", request.cms);
    Json::Value data;
    data["cms"] = request.cms == "on";
    console.Answer(std::string("This host ") + (request.cms == "on" ? "manages" : "does not manage") +
                       " its recording servers.",
                   data);
}

}  // namespace

void AddServer(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("server", "Hosts that show each other's cameras")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    CLI::App* pair = command("pair", "Lets another host show this one's cameras: writes the line for it", Pair);
    pair->add_option("name", request->name, "What the other host is called here")->required();
    pair->add_option("--address", request->address, "Where that host reaches this one (else its host name)");
    pair->add_option("--port", request->port, "The port of this host's HTTPS (else 8443)");
    CLI::App* add = command("add", "Takes the line of a host whose cameras are to be shown, from standard input", Add);
    add->add_option("name", request->name, "What the other host is called here")->required();
    add->add_option("--address", request->address, "Where to reach it (else as its line says)");
    command("list", "Lists the hosts", List);
    command("cameras", "Lists the cameras of those hosts with their ids here", ListCameras);
    command("remove", "Ends a pairing", Remove)->add_option("id", request->id, "The host's id")->required();
    command("configure", "Writes the web server's part anew", Configure)->group("");

    CLI::App* set = program.add_subcommand("set", "What this host is")->require_subcommand(1);
    CLI::App* cms = set->add_subcommand("cms", "Whether this host manages its recording servers");
    cms->add_option("value", request->cms, "on or off")->required()->check(CLI::IsMember({"on", "off"}));
    cms->callback([&console, request] { SetCms(console, *request); });
}

}  // namespace lookhaven::cli
