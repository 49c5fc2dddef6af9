// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Server: the hosts that this one is paired with: those whose cameras it shows, and those that show its own.
#include "standalone/api/own_apis.h"

#include "standalone/admin/invitation.h"
#include "standalone/admin/pair_by_code.h"
#include "standalone/admin/servers.h"
#include "standalone/admin/settings.h"
#include "standalone/api/fields.h"
#include "standalone/api/password_check.h"
#include "standalone/api/revision.h"
#include "standalone/base/clock.h"
#include "standalone/base/concat.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/remote/certificate_loader.h"
#include "standalone/remote/paired_host.h"
#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

using store::RecordingServer;
using store::RecordingServers;

constexpr int kDefaultPort = 8443;

Json::Value ToJson(const admin::ServerLoss& loss) {
    Json::Value json;
    json["camera"] = Json::arrayValue;
    for (const store::RemoteCamera& camera : loss.cameras) {
        Json::Value& one = json["camera"].append(Json::objectValue);
        one["id"] = camera.id;
        one["idOnServer"] = camera.id_on_server;
        one["name"] = camera.name;
    }
    json["denial"] = Json::arrayValue;
    for (const store::ServerDenial& denial : loss.denials) {
        Json::Value& one = json["denial"].append(Json::objectValue);
        one["user"] = denial.user;
        one["kind"] = denial.kind == store::EmapItemType::kCamera ? "camera" : "ioModule";
        one["id"] = denial.id;
    }
    return json;
}

// With what goes along with it, which is no part of what its revision stands for.
Json::Value Describe(store::Store& records, const RecordingServer& server) {
    Json::Value json = admin::ServerRecord(server);
    const Json::Value loss = ToJson(admin::LossOf(records, server.id));
    json["camera"] = loss["camera"];
    json["denial"] = loss["denial"];
    return json;
}

// What List returns of the host of a record, which somebody may have removed by now.
auto Completer(const Call& call) {
    return [&call](const Json::Value& record) {
        const auto server = RecordingServers(call.Records()).Find(record["id"].asInt());
        return server ? Describe(call.Records(), *server) : record;
    };
}

std::string List(const Call& call) {
    Json::Value data;
    data["server"] = Json::arrayValue;
    for (const RecordingServer& server : RecordingServers(call.Records()).List()) {
        data["server"].append(Describe(call.Records(), server));
    }
    data["centralManagement"] = store::Settings(call.Records()).Find(admin::kCentralManagement) == "on";
    return SuccessAnswer(data);
}

// Apart from List, since a host that is offline costs ten seconds.
std::string Check(const Call& call) {
    RecordingServers servers(call.Records());
    const auto server = servers.Find(IdIn(call, "id"));
    if (!server) {
        throw Failure(404, "there is no such host");
    }
    if (server->address.empty()) {
        throw Failure(400, "that host connects to this one, so it has no address to check");
    }
    const std::string secret = servers.FindSecret(server->id);
    std::string reason = "the pairing is disabled";
    if (server->enabled) {
        call.context.CloseRecords();
        reason = remote::AskPairedHost(*server, secret).failure;
    }
    Json::Value data;
    data["answers"] = reason.empty();
    data["reason"] = reason;
    return SuccessAnswer(data);
}

// The web server's certificate.
remote::CertificateFacts OwnCertificate(const Call& call) {
    try {
        return remote::LoadAndReadCertificate(
            base::ReadFile(call.context.Installation().TlsFolder() / "certificate.pem"));
    } catch (const std::runtime_error& error) {
        base::LogError(std::string("no pairing code: ") + error.what());
        throw Failure(409, "the certificate of this host's web server cannot be read");
    }
}

std::string Invite(const Call& call) {
    RequireNoPasswordInQuery(call);
    std::string name;
    TakeField(call, "name", name);
    Reauthenticate(call, "reauth");
    Json::Value data;
    data["code"] = admin::Invite(call.Records(), call.Actor(), name, OwnCertificate(call), base::TimeSinceBoot());
    data["seconds"] = Json::Int64{admin::kInvitationLifetimeS};
    return SuccessAnswer(data);
}

const char* NameOf(admin::CannotPair::Reason reason) {
    switch (reason) {
    case admin::CannotPair::Reason::kUnreachable:
        return R"({"reason":"unreachable"})";
    case admin::CannotPair::Reason::kCertificate:
        return R"({"reason":"certificate"})";
    case admin::CannotPair::Reason::kCode:
        return R"({"reason":"code"})";
    case admin::CannotPair::Reason::kTooMany:
        return R"({"reason":"tooMany"})";
    case admin::CannotPair::Reason::kUnclear:
        return R"({"reason":"unclear"})";
    }
    return "null";
}

std::string Add(const Call& call) {
    RequireNoPasswordInQuery(call);
    RequireNotInQuery(call, {"code"});
    std::string name;
    std::string address;
    std::string text;
    int port = kDefaultPort;
    bool is_confirmed = false;
    TakeField(call, "name", name);
    TakeField(call, "address", address);
    TakeField(call, "port", port);
    TakeField(call, "code", text);
    TakeField(call, "confirm", is_confirmed);
    Json::Value data;
    try {
        const remote::PairingCode code = remote::ParsePairingCode(text);
        Reauthenticate(call, "reauth");
        const admin::Records records{[&call]() -> store::Store& { return call.Records(); },
                                     [&call] { call.context.CloseRecords(); }};
        const admin::PairingOutcome made = admin::PairByCode(
            records, call.Actor(), {.name = name, .address = address, .port = port}, code, is_confirmed);
        data["server"] = Describe(call.Records(), made.server);
    } catch (const admin::MovesDenials& refusal) {
        data["confirm"] = ToJson(refusal.Loss());
    } catch (const remote::InvalidPairingCode& error) {
        throw Failure(400, error.what());
    } catch (const admin::CannotPair& error) {
        base::LogWarning(base::Concat("account ", call.Actor().name, " cannot pair with port ", port, " of ", address,
                                      ": ", error.what()));
        throw Failure(502, error.what(), 0, NameOf(error.Why()));
    }
    return SuccessAnswer(data);
}

std::string Remove(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    bool is_confirmed = false;
    TakeField(call, "confirm", is_confirmed);
    Json::Value data;
    try {
        data["removed"] = ToJson(OnCurrentRecord(Completer(call), [&] {
            return admin::RemoveServer(call.Records(), call.Actor(), IdIn(call, "id"), seen, is_confirmed);
        }));
    } catch (const admin::RemovesDenials& refusal) {
        data["confirm"] = ToJson(refusal.Loss());
    }
    return SuccessAnswer(data);
}

using enum Method::Accepts;
using enum Method::Audience;

constexpr Method kMethods[] = {{"List", List, kPostOnly, kManagers},
                               {"Check", Check, kPostOnly, kManagers},
                               {"Invite", Invite, kPostOnly, kManagers},
                               {"Add", Add, kPostOnly, kManagers},
                               {"Remove", Remove, kPostOnly, kManagers}};

}  // namespace

const OwnApi kServerApi{"VEXO.Server", kMethods};

}  // namespace lookhaven::api
