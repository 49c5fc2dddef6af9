// SPDX-License-Identifier: Apache-2.0
//
// The hosts that share the store: machines with a recorder, a web server and mounts each, which together are one
// installation. A store of one machine has none.
//
// Why so        Hosts that are paired (servers.h) have a store each, and owners of their own; these have one.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Whether a host can record more cameras, as its recorder says.
enum class HostRoom {
    kNone,  // it has no mount to record to
    kFree,
    kFull,  // its mounts have no space left that deleting recordings brings back
};

struct Host {
    int id = 0;                    // from 1, never used twice, since mounts carry it
    std::string name = {};         // UTF-8, 1 to 64 bytes, no other host's
    std::string address = {};      // a host name or address at which the other hosts reach its web server, …
    int port = 0;                  // … by HTTPS at this port, …
    std::string certificate = {};  // … which shows this certificate, in PEM
    std::string version = {};      // of Lookhaven there
    bool draining = false;         // gives the cameras away that others may record, and takes none
    HostRoom room = HostRoom::kNone;
    int processors = 0;  // as its recorder says; 0 before one has
    // The count of its recorder's lease (recorder_lease.h): changes while the recorder runs and reaches the store. A
    // host is offline once its heartbeat has not changed for a while of the watcher's own monotonic clock; the clocks of
    // two hosts are never compared.
    std::int64_t heartbeat = 0;
    std::string recorder = {};  // the name of the recorder that holds the lease; empty while none runs

    friend bool operator==(const Host&, const Host&) = default;
};

// Invariants    (1) Every change but these of a recorder raises Settings::Revision() in the same transaction.
class Hosts {
  public:
    // The store must outlive this object.
    explicit Hosts(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns; the first host gets the mounts that there are. room,
    // processors, heartbeat and recorder are ignored. Throws InvalidRecord or AlreadyExists.
    int Add(const Host& host);
    // Replaces name, address, port, certificate, version and draining of host.id. Throws as Add, and NotFound.
    void Update(const Host& host);
    // What a recorder says of host.id: version, room and processors. Raises no revision. Nothing happens for an unknown
    // host, or when it is stored so.
    void Report(const Host& host);
    // Removes the record, and gives up its leases; its mounts, with what lies on them, stay, and keep its id. Those of
    // the last host become a single machine's again. Throws NotFound; InvalidRecord while cameras are fixed to it.
    void Remove(int id);

    std::optional<Host> Find(int id);
    std::optional<Host> FindByName(const std::string& name);
    std::vector<Host> All();  // by id

    // The host that records the camera now, by its lease; 0 while none does. It may be offline, or removed.
    int HostOfCamera(int camera_id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
