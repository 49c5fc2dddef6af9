// SPDX-License-Identifier: Apache-2.0
//
// Shared mounts: which hosts have the folder of each, and which one of them maintains it.
//
// Why so        Locks on files of a network folder may or may not be seen by other machines, so what may happen on one
//               host alone is decided in the store. Which host maintains a mount is a lease, kept as long as its count
//               changes: not as long as the host's heartbeat does, since the folder may hang on a host that is well.
#pragma once

#include <cstdint>
#include <functional>
#include <stdexcept>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// The host does not maintain the mount, or not any more.
class LeaseLost : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

struct MountLease {
    int host_id = 0;  // 0: nobody has it
    std::int64_t count = 0;
};

class SharedMounts {
  public:
    // The store must outlive this object.
    explicit SharedMounts(Store& store) : connection_(store.connection()) {}

    // Whether the host has the mount's folder, as its recorder sees it: one that ends stays listed. A host that has not
    // gives its lease up. Nothing happens for an unknown mount or host.
    void SetPresence(int mount_id, int host, bool is_there);
    // The hosts that have it, by id; they may be offline.
    std::vector<int> HostsWith(int mount_id);

    // Its holder may be offline.
    MountLease Lease(int mount_id);
    // Changes the count of the host's lease. False when the host has none.
    bool Renew(int mount_id, int host);
    // Takes a lease that nobody has. False when somebody has it.
    bool TakeFree(int mount_id, int host);
    // Takes the lease from its holder, if it still is as it was read. The former holder learns of that when it renews.
    bool TakeOver(int mount_id, int host, const MountLease& stale);
    // Gives the lease up if it is the host's.
    void Release(int mount_id, int host);
    // Renews the lease and calls change in one transaction, during which nobody takes the lease. Throws LeaseLost, and
    // what change throws; the store is then as before.
    void ChangeWithLease(int mount_id, int host, const std::function<void()>& change);

    // The clock of PostgreSQL's server, UTC, which all hosts see alike.
    std::int64_t ServerTimeS();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
