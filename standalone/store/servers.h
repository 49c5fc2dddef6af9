// SPDX-License-Identifier: Apache-2.0
//
// Hosts that this one is paired with, and the cameras of theirs that it knows.
#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/emaps.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

struct RecordingServer {
    int id = 0;                    // from 1, never used twice
    std::string name = {};         // UTF-8, 1 to 64 bytes, no other paired host's
    std::string address = {};      // a host name or address; empty for one that only connects to this host
    int port = 0;                  // of its web server; 0 with an empty address
    std::string certificate = {};  // PEM, what its web server must show; given with an address
    bool enabled = true;
};

constexpr unsigned int kMaxServerCameras = 1000;  // what a host says of itself must not fill the store

// A camera of a paired host. Its id comes from the same counter as those of this host's own.
struct RemoteCamera {
    int id = 0;
    int server_id = 0;
    int id_on_server = 0;
    std::string name = {};  // UTF-8, 1 to 255 bytes
    base::Codec video_type = base::Codec::kMjpeg;
    bool audio = false;

    friend bool operator==(const RemoteCamera&, const RemoteCamera&) = default;
};

// A right that a user lacks at a camera or device of a paired host.
struct ServerDenial {
    std::string user;
    EmapItemType kind = EmapItemType::kCamera;  // a camera or an I/O module
    int id = 0;                                 // on this host
};

// Tells pairings apart by the secret that both hosts share, without telling it; never 0. Means nothing outside this run
// of the program.
std::uint64_t PairingId(const std::string& secret);

// Invariants    (1) Every change raises Settings::Revision() in the same transaction.
//               (2) A secret comes out of InboundPeerSecrets and FindSecret alone, never with the record.
class RecordingServers {
  public:
    // The store must outlive this object.
    explicit RecordingServers(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns. secret: shared with that host, 64 hexadecimal digits. Throws
    // InvalidRecord or AlreadyExists.
    int Add(const RecordingServer& server, const std::string& secret);
    // Replaces the record of server.id, the secret when one is given. Throws as Add, and NotFound.
    void Update(const RecordingServer& server, const std::optional<std::string>& secret = {});
    // Adds the host with its cameras, or updates the one of that name: a camera keeps its id here, and thereby who
    // is denied it, and one that is not among the cameras any more stays. Returns the id. Throws as Add; AlreadyExists
    // where the name is that of a host that connects to this one, and the other way round.
    int Pair(const RecordingServer& server, const std::string& secret, const std::vector<RemoteCamera>& cameras);
    // Throws as Pair would for the record by itself, and stores nothing.
    void RequirePairable(const RecordingServer& server);
    // Removes the host with its cameras and devices, and Denials(id) with them; their ids are not used again. Throws
    // NotFound.
    void Remove(int id);
    // What users are denied of the host, by user.
    std::vector<ServerDenial> Denials(int id);

    std::optional<RecordingServer> Find(int id);
    std::vector<RecordingServer> List();  // by id

    // Empty for an unknown or disabled host.
    std::string FindSecret(int id);
    // The secrets of the enabled hosts without an address, which connect to this one. The secret of a host that this
    // host connects to admits nobody here.
    std::vector<std::string> InboundPeerSecrets();
    // The pairings of all enabled hosts, whichever side connects.
    std::set<std::uint64_t> Pairings();

    // Gives the host's camera an id on this host, or updates the record of one that has it; camera.id is ignored.
    // Returns the id. Throws InvalidRecord, or NotFound for an unknown host.
    int PutCamera(const RemoteCamera& camera);
    // The same for all cameras that the host has now, in one transaction; their server_id is ignored. Nothing is
    // written, and no revision raised, when all are known so. Returns how many are new here.
    int PutCameras(int server_id, const std::vector<RemoteCamera>& cameras);
    // Throws NotFound.
    void RemoveCamera(int id);
    std::optional<RemoteCamera> FindCamera(int id);
    std::optional<RemoteCamera> FindCamera(int server_id, int id_on_server);
    std::vector<RemoteCamera> ListCameras();               // by id
    std::vector<RemoteCamera> ListCameras(int server_id);  // its own alone

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
