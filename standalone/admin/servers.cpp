// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/servers.h"

#include <algorithm>
#include <map>
#include <utility>

#include "standalone/admin/change.h"
#include "standalone/admin/settings.h"
#include "standalone/store/secret.h"
#include "standalone/store/transaction.h"

namespace lookhaven::admin {

namespace {

using store::RecordingServer;
using store::RecordingServers;

constexpr std::size_t kSecretBytes = 32;

RecordingServer RequireServer(store::Store& store, int id) {
    std::optional<RecordingServer> server = RecordingServers(store).Find(id);
    if (!server) {
        throw store::NotFound("there is no paired host " + std::to_string(id));
    }
    return *std::move(server);
}

Json::Value Audited(const RecordingServer& server) {
    Json::Value record = ServerRecord(server);
    record.removeMember("revision");
    return record;
}

// Null where there is none of that name.
Json::Value AuditedByName(store::Store& store, const std::string& name) {
    const std::vector<RecordingServer> all = RecordingServers(store).List();
    const auto found = std::ranges::find(all, name, &RecordingServer::name);
    return found == all.end() ? Json::Value() : Audited(*found);
}

bool AreAllKnown(store::Store& store, int id, const std::vector<store::RemoteCamera>& cameras) {
    std::map<int, store::RemoteCamera> known;
    for (store::RemoteCamera& camera : RecordingServers(store).ListCameras(id)) {
        known[camera.id_on_server] = std::move(camera);
    }
    return std::ranges::all_of(cameras, [&known](const store::RemoteCamera& camera) {
        const auto found = known.find(camera.id_on_server);
        return found != known.end() && found->second.name == camera.name && found->second.audio == camera.audio &&
               found->second.video_type == camera.video_type;
    });
}

// The audit log says that there is a new secret, not which.
Change Paired(const char* action, const RecordingServer& server, const Json::Value& before) {
    Change change{action, Named(server.name, server.id), before, Audited(server)};
    change.after["secret"] = "new";
    return change;
}

}  // namespace

Json::Value ServerRecord(const RecordingServer& server) {
    Json::Value json;
    json["id"] = server.id;
    json["name"] = server.name;
    json["address"] = server.address;
    json["port"] = server.port;
    json["enabled"] = server.enabled;
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

NewPairing AdmitServer(store::Store& store, const Actor& actor, const std::string& name) {
    NewPairing made;
    made.server.name = name;
    Apply(store, actor, [&] {
        made.secret = store::RandomHex(kSecretBytes);
        const Json::Value before = AuditedByName(store, name);
        made.server.id = RecordingServers(store).Pair(made.server, made.secret, {});
        return Paired("server.admit", made.server, before);
    });
    return made;
}

RecordingServer AddServer(store::Store& store, const Actor& actor, RecordingServer server, const std::string& secret,
                          const std::vector<store::RemoteCamera>& cameras, AddingOptions options) {
    store::InTransaction(store, [&] {
        Apply(store, actor, [&] {
            if (!options.confirmed) {
                RequireSameServer(store, server);
            }
            const Json::Value before = AuditedByName(store, server.name);
            server.id = RecordingServers(store).Pair(server, secret, cameras);
            Change change = Paired("server.add", server, before);
            change.after["cameras"] = static_cast<Json::UInt64>(cameras.size());
            return change;
        });
        if (options.shows_cameras) {
            SetSetting(store, actor, kCentralManagement, {}, true);
        }
    });
    return server;
}

int PutServerCameras(store::Store& store, const Actor& actor, int id, const std::vector<store::RemoteCamera>& cameras) {
    RequireManager(store, actor);
    if (AreAllKnown(store, id, cameras)) {
        return 0;  // each minute: locks nothing
    }
    int added = 0;
    Apply(store, actor, [&] {
        const RecordingServer server = RequireServer(store, id);
        added = RecordingServers(store).PutCameras(id, cameras);
        Json::Value after;
        if (added > 0) {
            after["added"] = added;
        }
        return Change{"server.cameras", Named(server.name, id), {}, after};
    });
    return added;
}

RecordingServer SetServer(store::Store& store, const Actor& actor, int id, const ServerChange& change) {
    RecordingServer server;
    Apply(store, actor, [&] {
        const RecordingServer before = RequireServer(store, id);
        server = before;
        server.name = change.name.value_or(server.name);
        server.enabled = change.enabled.value_or(server.enabled);
        server.address = change.address.value_or(server.address);
        server.port = change.port.value_or(server.port);
        RecordingServers(store).Update(server);
        return Change{"server.set", Named(server.name, id), Audited(before), Audited(server)};
    });
    return server;
}

ServerLoss LossOf(store::Store& store, int id) {
    return {RecordingServers(store).ListCameras(id), RecordingServers(store).Denials(id)};
}

void RequireSameServer(store::Store& store, const RecordingServer& server) {
    for (const RecordingServer& known : RecordingServers(store).List()) {
        if (known.name == server.name && !known.address.empty() && known.certificate != server.certificate) {
            ServerLoss loss = LossOf(store, known.id);
            if (!loss.denials.empty()) {
                throw MovesDenials(std::move(loss));
            }
        }
    }
}

ServerLoss RemoveServer(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                        bool confirmed) {
    ServerLoss loss;
    Apply(store, actor, [&] {
        const RecordingServer server = RequireServer(store, id);
        RequireCurrent(ServerRecord(server), seen);
        loss = LossOf(store, id);
        if (!loss.denials.empty() && !confirmed) {
            throw RemovesDenials(loss);
        }
        RecordingServers(store).Remove(id);
        Change change{"server.remove", Named(server.name, id), Audited(server), {}};
        change.before["cameras"] = static_cast<Json::UInt64>(loss.cameras.size());
        for (const store::ServerDenial& denial : loss.denials) {
            const char* kind = denial.kind == store::EmapItemType::kCamera ? "camera " : "I/O module ";
            change.before["denied"].append(denial.user + ": " + kind + std::to_string(denial.id));
        }
        return change;
    });
    return loss;
}

}  // namespace lookhaven::admin
