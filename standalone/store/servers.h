// SPDX-License-Identifier: Apache-2.0
//
// Hosts that this one is paired with, and the cameras of theirs that it knows.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

struct RecordingServer {
    int id = 0;                    // from 1, never used twice
    std::string name = {};         // UTF-8, 1 to 64 bytes, no other server's
    std::string address = {};      // a host name or address; empty when only that host asks this one
    int port = 0;                  // of its web server; 0 with an empty address
    std::string certificate = {};  // PEM, what its web server must show; given with an address
    bool enabled = true;
};

// A camera of a recording server. Its id comes from the same counter as those of this host's own.
struct RemoteCamera {
    int id = 0;
    int server_id = 0;
    int id_on_server = 0;
    std::string name = {};  // UTF-8, 1 to 255 bytes
    base::Codec video_type = base::Codec::kMjpeg;
    bool audio = false;
};

// Invariants    (1) Every change raises Settings::Revision() in the same transaction.
//               (2) A secret comes out of AskersSecrets and FindSecret alone, never with the record.
class RecordingServers {
  public:
    // The store must outlive this object.
    explicit RecordingServers(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns. secret: shared with that host, 64 hexadecimal digits. Throws
    // InvalidRecord or AlreadyExists.
    int Add(const RecordingServer& server, const std::string& secret);
    // Replaces the record of server.id, the secret when one is given. Throws as Add, and NotFound.
    void Update(const RecordingServer& server, const std::optional<std::string>& secret = {});
    // Removes the server and what is known of its cameras and devices. Throws NotFound.
    void Remove(int id);

    std::optional<RecordingServer> Find(int id);
    std::vector<RecordingServer> List();  // by id

    // Empty for an unknown or disabled server.
    std::string FindSecret(int id);
    // Of the enabled servers that ask this host, which are those without an address. What this host shows to a server that it
    // asks itself lets nobody in here.
    std::vector<std::string> AskersSecrets();

    // Gives the server's camera an id on this host, or renews what is known of one that has it; returns the id. Throws
    // NotFound for an unknown server, InvalidRecord.
    int PutCamera(const RemoteCamera& camera);
    // Throws NotFound.
    void RemoveCamera(int id);
    std::optional<RemoteCamera> FindCamera(int id);
    std::optional<RemoteCamera> FindCamera(int server_id, int id_on_server);
    std::vector<RemoteCamera> ListCameras();  // by id

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
