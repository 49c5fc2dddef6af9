// SPDX-License-Identifier: Apache-2.0
//
// Shared mounts: which hosts have the folder of each, and which one of them maintains it.
//
// Why so        Locks on files of a network folder may or may not be seen by other machines, so what may happen on one
//               host alone is decided in the store. A host keeps a lease as long as its heartbeat (hosts.h) changes.
#pragma once

#include <vector>

#include "standalone/store/hosts.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

class SharedMounts {
  public:
    // The store must outlive this object.
    explicit SharedMounts(Store& store) : connection_(store.connection()) {}

    // Whether the host has the mount's folder. One that does not gives its lease up. Nothing happens for an unknown
    // mount or host.
    void NotePresence(int mount_id, int host, bool is_there);
    // The hosts that have it, by id; they may be offline.
    std::vector<int> HostsWith(int mount_id);

    // The host that maintains the mount; 0 while none does. It may be offline.
    int Maintainer(int mount_id);
    // Takes the lease that nobody has, or the host of that record as long as its heartbeat is still that one. False
    // when somebody else was faster. A heartbeat that comes meanwhile is not waited for: until the former one has
    // asked again, both may maintain the mount, which deletes nothing that one of them alone would not delete.
    bool Take(int mount_id, int host, const Host& silent = {});
    // Gives the lease up if it is the host's.
    void Release(int mount_id, int host);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
