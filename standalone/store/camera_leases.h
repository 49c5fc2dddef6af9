// SPDX-License-Identifier: Apache-2.0
//
// Which host of store/hosts.h records which camera: a lease each, of one host at any time.
//
// Why so        A thousand leases that are renewed every few seconds would keep the store busy, so a lease lasts as
//               long as its host's heartbeat changes. Who takes it from a silent host does so only while that
//               heartbeat is still the one that stood still, which is judged under the lock of the host's row.
// Invariants    (1) A lease changes hands when its holder gave it up, is silent, or was removed, and never otherwise.
//               (2) Its count grows with each change, so that nobody takes what has changed since it looked.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// A camera, and who records it.
struct CameraLease {
    int camera_id = 0;
    bool enabled = true;
    int fixed_host_id = 0;              // Camera::host_id
    int host_id = 0;                    // the holder; 0: nobody
    std::int64_t count = 0;             // 0: nobody ever had it
    int next_host_id = 0;               // to which an operator moved it; 0: it stays
    std::int64_t bytes_per_second = 0;  // that it sends, as who records it measured last; 0: not yet

    friend bool operator==(const CameraLease&, const CameraLease&) = default;
};

class CameraLeases {
  public:
    // The store must outlive this object.
    explicit CameraLeases(Store& store) : connection_(store.connection()) {}

    // The leases of all cameras, by camera id, including those that no host ever held.
    std::vector<CameraLease> List();
    // Gives the host the lease if it is still as it was seen; silent_heartbeat: that of the holder, if there is one.
    // False when somebody was faster, or the holder is not silent.
    bool Take(const CameraLease& seen, int host, std::int64_t silent_heartbeat);
    // Gives up the host's lease; does nothing when it has none of that camera.
    void Release(int camera, int host);
    // Stores how many bytes a second the host's cameras send, by camera; does nothing for those that it does not hold.
    void SetRates(int host, const std::map<int, std::int64_t>& bytes_per_second);
    // Has the holder give the camera to that host, once it can take it. Does nothing for a camera that nobody ever
    // had.
    void Move(int camera, int next_host);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
