// SPDX-License-Identifier: Apache-2.0
//
// This host's part in a shared mount (store/shared_mounts.h): whether it maintains it.
#pragma once

#include <cstdint>
#include <set>

#include "standalone/recorder/assignment.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::recorder {

class MountLeaseKeeper {
  public:
    // host, offline_us: as in HostWatch.
    MountLeaseKeeper(int mount_id, int host, std::int64_t offline_us)
        : mount_id_(mount_id),
          host_(host),
          watch_(offline_us) {}

    // Call every second while the mount is here. Takes the lease that nobody has, or a host that is offline.
    void Renew(store::Store& store, std::int64_t now_us);
    // The mount is not here, or fails here.
    void GiveUp(store::Store& store);

    // As of the last of these calls.
    bool IsHeld() const { return is_held_; }
    // Whether the lease came, or the set of hosts changed, since this was last asked: what others have left may
    // be this host's to recover now.
    bool HasChanged();

  private:
    bool Take(store::Store& store, std::int64_t now_us);

    const int mount_id_;
    const int host_;
    HostWatch watch_;
    std::set<int> hosts_;
    bool is_held_ = false;
    bool has_changed_ = false;
};

}  // namespace lookhaven::recorder
