// SPDX-License-Identifier: Apache-2.0
//
// Changes of the hosts that this one is paired with: those whose cameras it shows, and those that show its own.
//
// Invariants    (1) No secret and no certificate is in a record or in the audit log.
//               (2) A pairing is renewed by its name: the cameras keep their ids, and what users are denied stays
//                   denied.
// Failures      Besides what its declaration names, each throws Forbidden, store::NotFound, store::InvalidRecord and
//               store::StoreError; nothing was changed then.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/servers.h"

namespace lookhaven::admin {

// {"id", "name", "address", "port", "enabled", "revision"}; the address is empty, and the port 0, for a host that shows
// this one's cameras.
Json::Value ServerRecord(const store::RecordingServer& server);

struct NewPairing {
    store::RecordingServer server;
    std::string secret;  // for the paired host, given out here alone
};

// Lets a host, which has that name here, show this one's cameras from now on, or renews that with another secret.
// Throws store::AlreadyExists where the name is that of a host whose cameras this one shows.
NewPairing AdmitServer(store::Store& store, const Actor& actor, const std::string& name);

struct AddingOptions {
    bool shows_cameras = false;  // also sets kCentralManagement, as SetSetting does
    bool confirmed = false;      // whatever users are denied of a host of that name
};

// Adds a host whose cameras are to be shown, or renews its pairing; server.id is ignored. Returns the record as it is
// then. Throws MovesDenials as RequireSameServer does, unless confirmed; store::AlreadyExists where the name is that of
// a host that shows this one's cameras.
store::RecordingServer AddServer(store::Store& store, const Actor& actor, store::RecordingServer server,
                                 const std::string& secret, const std::vector<store::RemoteCamera>& cameras,
                                 AddingOptions options);

// Makes known the cameras that the host has now, as RecordingServers::PutCameras does. Returns how many are new here.
int PutServerCameras(store::Store& store, const Actor& actor, int id, const std::vector<store::RemoteCamera>& cameras);

// What is to be different; what is empty stays.
struct ServerChange {
    std::optional<std::string> name = {};
    std::optional<std::string> address = {};
    std::optional<int> port = {};
    std::optional<bool> enabled = {};
};
store::RecordingServer SetServer(store::Store& store, const Actor& actor, int id, const ServerChange& change);

// What goes with a pairing.
struct ServerLoss {
    std::vector<store::RemoteCamera> cameras;
    std::vector<store::ServerDenial> denials;  // of them, and of the host's other devices
};
ServerLoss LossOf(store::Store& store, int id);

// Users are denied something of the host, and a new pairing would allow it, since the cameras get other ids then;
// nothing was removed.
class RemovesDenials : public std::runtime_error {
  public:
    explicit RemovesDenials(ServerLoss loss)
        : std::runtime_error("removing this host also removes what users are denied of it"),
          loss_(std::move(loss)) {}
    const ServerLoss& Loss() const { return loss_; }

  private:
    ServerLoss loss_;
};

// A host is known by that name whose certificate is another one, and users are denied something of it. Were the new
// one stored, they would be denied what has the same ids there, and nothing of the old one.
class MovesDenials : public std::runtime_error {
  public:
    explicit MovesDenials(ServerLoss loss)
        : std::runtime_error("the host that is known by this name has another certificate; what users are denied of it "
                             "would hold for this one"),
          loss_(std::move(loss)) {}
    const ServerLoss& Loss() const { return loss_; }

  private:
    ServerLoss loss_;
};

// What AddServer refuses, where it is to be known earlier. Throws MovesDenials.
void RequireSameServer(store::Store& store, const store::RecordingServer& server);

// Ends the pairing, and returns what went with it. seen: the record's revision that the actor saw; nothing for whatever
// it is. Throws RemovesDenials unless confirmed, and Stale.
ServerLoss RemoveServer(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                        bool confirmed);

}  // namespace lookhaven::admin
