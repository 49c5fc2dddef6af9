// SPDX-License-Identifier: Apache-2.0
//
// lookhaven server: hosts that show each other's cameras.
//
// Why so        Pairing takes one line of text, which a person carries from the host that has the cameras to the one
//               that is to show them: the host's address and certificate, its cameras, and a secret that only the two
//               share. Or a short code, which a person can read out, and by which the two exchange the rest themselves.
#include <iostream>
#include <optional>

#include <unistd.h>

#include "standalone/admin/invitation.h"
#include "standalone/admin/pair_by_code.h"
#include "standalone/admin/servers.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/host_name.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/pair_text.h"
#include "standalone/cli/table.h"
#include "standalone/remote/certificate.h"
#include "standalone/remote/paired_host.h"
#include "standalone/store/cameras.h"
#include "standalone/store/servers.h"

namespace lookhaven::cli {

namespace {

using store::RecordingServer;
using store::RecordingServers;
using store::RemoteCamera;

constexpr int kDefaultPort = 8443;

struct Request {
    int id = 0;
    bool yes = false;
    std::string name;
    std::string address;
    int port = kDefaultPort;
    admin::ServerChange change;
};

Json::Value ToData(const RecordingServer& server) {
    return Object("id", server.id, "name", server.name, "address", server.address, "port", server.port, "enabled",
                  server.enabled);
}

// A host without an address only connects to this one.
std::string AddressText(const Json::Value& address) {
    const std::string text = address.asString();
    return text.empty() ? "incoming only" : text;
}

constexpr Column kColumns[] = {
    {"id", "id"}, {"name", "name"}, {"address", "address", AddressText}, {"port", "port", TextUnlessZero}};
constexpr Column kCameraColumns[] = {
    {"id", "id"}, {"name", "name"}, {"server", "server"}, {"id on server", "id_on_server"}};

constexpr Column kRefreshColumns[] = {{"id", "id"}, {"name", "name"}, {"new cameras", "new"}};

std::vector<RemoteCamera> OwnCameras(store::Store& store) {
    std::vector<RemoteCamera> cameras;
    for (const store::Camera& camera : store::Cameras(store).List()) {
        cameras.push_back(
            {.id_on_server = camera.id, .name = camera.name, .video_type = camera.video_type, .audio = camera.audio});
    }
    return cameras;
}

std::string OwnCertificate(const Console& console) {
    return base::ReadFile(console.Installation().TlsFolder() / "certificate.pem");
}

// Only the line itself goes to standard output, so that it can be redirected.
void Pair(const Console& console, const Request& request) {
    const std::string address = request.address.empty() ? base::OwnHostName() : request.address;
    if (!base::IsHost(address)) {
        throw Failure(kDataError, "the address ", address, " is neither a host name nor an IP address");
    }
    store::Store store = console.OpenStore();
    const std::string certificate = remote::CertificatesIn(OwnCertificate(console));
    const std::vector<RemoteCamera> cameras = OwnCameras(store);
    const admin::NewPairing made = admin::AdmitServer(store, {}, request.name);
    const std::string text = ToText({address, request.port, certificate, made.secret, cameras});
    Json::Value data = ToData(made.server);
    data["text"] = text;
    console.Answer(data, text);
    if (!console.json) {
        std::cerr
            << "Enter this line in \"lookhaven server add\" on " << request.name
            << ", which may then show every camera of this host. Keep it secret: anyone who has it may do the same.\n";
    }
}

// Likewise.
void Invite(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::string code =
        admin::Invite(store, {}, request.name, remote::ReadCertificate(OwnCertificate(console)), base::TimeSinceBoot());
    console.Answer(Object("code", code, "seconds", Json::Int64{admin::kInvitationLifetimeS}), code);
    if (!console.json) {
        std::cerr << "Enter this code on " << request.name
                  << ", which may then show every camera of this host: in the browser, or in \"lookhaven server add\""
                     " with this host's address. It is valid once, for "
                  << admin::kInvitationLifetimeS / 60 << " minutes, until a newer one is printed or shown.\n";
    }
}

std::string ReadPairText() {
    if (::isatty(STDIN_FILENO) != 0) {
        std::cerr
            << "The line from lookhaven server pair on the other host, or its code from lookhaven server invite: ";
    }
    std::string line;
    std::getline(std::cin, line);
    return line;
}

// Why the host does not answer and what to do about it, as lines to append to an answer; empty when it answers.
std::string ConnectionProblem(const RecordingServer& server, const std::string& secret) {
    const std::string failure = remote::AskPairedHost(server, secret).failure;
    return failure.empty() ? ""
                           : Concat("\nIt does not answer at ", server.address, " port ", server.port, ": ", failure,
                                    ".\nThe pairing is kept; if its address or port differs: lookhaven server set ",
                                    server.id, " --address ADDRESS --port PORT");
}

Json::Value DenialData(const store::ServerDenial& denial) {
    const char* kind = denial.kind == store::EmapItemType::kCamera ? "camera" : "I/O module";
    return Object("user", denial.user, "kind", kind, "id", denial.id);
}

// "guest: camera 4, I/O module 2; ann: camera 4"
std::string DenialsText(const Json::Value& denials) {
    std::string text;
    std::string user;
    for (const Json::Value& denial : denials) {
        const bool is_next = denial["user"] == user;
        user = denial["user"].asString();
        text += (text.empty() ? ""
                 : is_next    ? ", "
                              : "; ") +
                (is_next ? "" : user + ": ") + denial["kind"].asString() + " " + PlainText(denial["id"]);
    }
    return text;
}

Json::Value DenialsData(const admin::ServerLoss& loss) {
    return Array(loss.denials, DenialData);
}

admin::PairingOutcome AddByLine(store::Store& store, const std::string& line, const Request& request) {
    const PairOffer offer = ParsePairText(line);
    remote::CertificateName(offer.certificate);  // throws before anything is stored
    RecordingServer server{.name = request.name,
                           .address = request.address.empty() ? offer.address : request.address,
                           .port = request.change.port.value_or(offer.port),
                           .certificate = remote::CertificatesIn(offer.certificate)};
    server = admin::AddServer(store, {}, server, offer.secret, offer.cameras, {.confirmed = request.yes});
    return {server, offer.secret, offer.cameras.size()};
}

admin::PairingOutcome AddByCode(store::Store& store, const std::string& line, const Request& request) try {
    const remote::PairingCode code = remote::ParsePairingCode(line);
    if (request.address.empty()) {
        throw Failure(kUsage, "with a code, --address says where the other host is reached");
    }
    const admin::Records records{[&store]() -> store::Store& { return store; }};
    return admin::PairByCode(
        records, {},
        {.name = request.name, .address = request.address, .port = request.change.port.value_or(kDefaultPort)}, code,
        request.yes);
} catch (const remote::InvalidPairingCode& error) {
    throw Failure(kDataError, error.what(), "; the line from lookhaven server pair begins with ", kPairTextPrefix);
} catch (const admin::CannotPair& error) {
    throw Failure(kUnavailable, error.what());
}

void Add(const Console& console, const Request& request) try {
    const std::string line = ReadPairText();
    store::Store store = console.OpenStore();
    const auto add = line.starts_with(kPairTextPrefix) ? AddByLine : AddByCode;
    const auto [server, secret, cameras] = add(store, line, request);
    const std::string problem = ConnectionProblem(server, secret);
    Json::Value data = ToData(server);
    data["answers"] = problem.empty();
    console.Answer(data, "Added the paired host ", server.name, " with id ", server.id, " and ", cameras, " cameras.",
                   problem);
} catch (const admin::MovesDenials& refusal) {
    throw Failure(kDataError, refusal.what(), " (", DenialsText(DenialsData(refusal.Loss())),
                  "); add --yes to confirm, or another name");
}

// Secret, certificate and cameras stay.
void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const RecordingServer server = admin::SetServer(store, {}, request.id, request.change);
    const bool is_tried = server.enabled && !server.address.empty();
    const std::string problem =
        is_tried ? ConnectionProblem(server, RecordingServers(store).FindSecret(server.id)) : "";
    Json::Value data = ToData(server);
    data["answers"] = is_tried && problem.empty();
    console.Answer(data, "Changed the paired host ", server.name, ".", problem);
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(RecordingServers(store).List(), ToData);
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    try {
        const Json::Value denials = DenialsData(admin::RemoveServer(store, {}, request.id, {}, request.yes));
        console.Answer(Object("id", request.id, "denials", denials), "Removed the paired host ", request.id,
                       " with its cameras",
                       denials.empty() ? "" : ", and what users were denied of it: ", DenialsText(denials), ".");
    } catch (const admin::RemovesDenials& refusal) {
        throw Failure(kDataError, refusal.what(), " (", DenialsText(DenialsData(refusal.Loss())),
                      "); add --yes to confirm");
    }
}

void ListCameras(const Console& console) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(RecordingServers(store).ListCameras(), [](const RemoteCamera& camera) {
        return Object("id", camera.id, "name", camera.name, "server", camera.server_id, "id_on_server",
                      camera.id_on_server);
    });
    console.Answer(data, Table(kCameraColumns, data));
}

void Refresh(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    std::string failures;
    const auto note = [&](const RecordingServer& server, const std::string& failure) {
        failures += Concat(failures.empty() ? "" : "; ", "the paired host ", server.name, " failed: ", failure);
    };
    for (const auto& [server, cameras, failure] : remote::AskPairedHosts(store)) {
        if (!failure.empty()) {
            note(server, failure);
            continue;
        }
        try {
            data.append(Object("id", server.id, "name", server.name, "new",
                               admin::PutServerCameras(store, {}, server.id, cameras)));
        } catch (const std::exception& refusal) {
            note(server, refusal.what());
        }
    }
    if (!failures.empty()) {
        throw Failure(kUnavailable, failures);
    }
    console.Answer(data, Table(kRefreshColumns, data));
}

}  // namespace

void AddServer(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "server", "Hosts that show each other's cameras");
    Request& request = group.request();
    const std::string name = "The other host's name here";
    group.Add("pair", "Lets another host show this one's cameras, or renews that: prints a line to enter there", Pair)
        .Option("name", request.name, name, Required)
        .Option("--address", request.address, "This host's address for the other one (default: its host name)")
        .Option("--port", request.port, "This host's HTTPS port (default: 8443)", Satisfies(CLI::Range(1, 65535)));
    group.Add("invite", "Likewise: prints a code to enter there, which is valid once, for ten minutes", Invite)
        .Option("name", request.name, name, Required);
    group
        .Add("add",
             "Reads the line or code of a host whose cameras are to be shown from standard input, also of a known host",
             Add)
        .Option("name", request.name, name, Required)
        .Option("--address", request.address, "The other host's address (default: as in the line)")
        .Option("--port", request.change.port, "Its HTTPS port (default: as in the line; with a code, 8443)",
                Satisfies(CLI::Range(1, 65535)))
        .Flag("--yes", request.yes, "Also in place of another host of that name, of which users are denied something");
    group.Add("set", "Changes where a host is reached, or what it is called, without pairing again", Change)
        .Option("id", request.id, "The host's id", Required)
        .Option("--name", request.change.name, name)
        .Option("--address", request.change.address, "Its address")
        .Option("--port", request.change.port, "Its HTTPS port", Satisfies(CLI::Range(1, 65535)))
        .Switch("--enable,!--disable", request.change.enabled, "Whether the two hosts may ask each other");
    group.Add("list", "Lists the hosts", List);
    group.Add("cameras", "Lists the cameras of paired hosts with their ids here", ListCameras);
    group.Add("refresh", "Asks the hosts for cameras that were added there", Refresh);
    group.Add("remove", "Ends a pairing", Remove)
        .Option("id", request.id, "The host's id", Required)
        .Flag("--yes", request.yes, "Also where users are denied some of its cameras or devices");
}

}  // namespace lookhaven::cli
