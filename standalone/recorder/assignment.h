// SPDX-License-Identifier: Apache-2.0
//
// Which cameras a host takes and gives away, decided by each host for itself from what all of them see.
//
// Why so        There is no host that decides for the others, and so none to lose. Every host shares the free cameras
//               out among all hosts in the same way, and takes its own part; where two see the store a moment apart,
//               the lease goes to one of them (store/camera_leases.h).
// Invariants    (1) A camera that is fixed to a host is taken by that host alone.
//               (2) Nothing is given away that nobody is there to take: recording by the wrong host is better than
//                   none.
//               (3) A floating camera moves when its holder is offline, drains, or an operator moved it, and never
//                   otherwise.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "standalone/store/camera_leases.h"
#include "standalone/store/hosts.h"

namespace lookhaven::recorder {

// Which hosts are offline, by this process's own clock.
//
// Why so        While the store is unreachable for everybody no heartbeat changes, and the one that reaches it first
//               afterwards must not take everybody else for silent. So only time through which this process itself
//               saw the store counts.
class HostWatch {
  public:
    // offline_us: how long a heartbeat stands still until its host counts as offline.
    explicit HostWatch(std::int64_t offline_us) : offline_us_(offline_us) {}

    // Call every second while the store can be reached. A host that was not seen before counts as online.
    void Observe(const std::vector<store::Host>& hosts, std::int64_t now_us);
    // As of the last Observe; false for an unknown host.
    bool IsOnline(int host) const;

  private:
    struct Heartbeat {
        std::int64_t count = 0;
        std::int64_t changed_us = 0;
    };

    const std::int64_t offline_us_;
    std::int64_t observed_us_ = 0;
    std::map<int, Heartbeat> heartbeats_;
};

struct AssignedHost {
    int id = 0;
    bool is_online = false;  // what it has is its own
    bool runs = false;       // as far as can be told; it may have been stopped a moment ago and start again
    bool takes = false;      // floating cameras: it runs, has a mount to record to, and does not drain
    bool gives = false;      // its floating cameras, where another host takes them
    bool is_full = false;    // takes those alone that no other host takes
    int processors = 0;      // as store::Host
};

struct Assignment {
    std::vector<store::CameraLease> take;  // leases that nobody has, or a host that is offline
    std::vector<int> give;                 // cameras whose lease is this host's
};

// own: this host's id, which is among the hosts. A floating camera goes to the host that has the least to do with it
// (store/host_loads.h), of several to that with the lowest id.
Assignment Assign(int own, const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras);

}  // namespace lookhaven::recorder
