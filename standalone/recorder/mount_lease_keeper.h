// SPDX-License-Identifier: Apache-2.0
//
// This host's part in a shared mount (store/shared_mounts.h): whether it maintains it.
#pragma once

#include <cstdint>
#include <optional>
#include <set>

#include "standalone/recorder/assignment.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::recorder {

class MountLeaseKeeper {
  public:
    // offline_us: as in HostWatch. The lease of a host that is offline is taken over, and one that stands still for ten
    // times as long, since long work may renew it seldom.
    MountLeaseKeeper(int mount_id, int host, std::int64_t offline_us)
        : mount_id_(mount_id),
          host_(host),
          offline_us_(offline_us),
          host_watch_(offline_us),
          lease_watch_(10 * offline_us) {}

    // Call every second while the folder is mounted here. Renews the lease, or takes it where that may be taken. Throws
    // store::StoreError.
    void Update(store::Store& store, std::int64_t now_us);
    // Call when the folder fails here: releases the lease, so that another host can maintain the mount. Throws
    // store::StoreError.
    void GiveUp(store::Store& store);
    // Call when the store has refused a change, or has ended the lease: from then on IsHeld is false. The store is not
    // asked.
    void NoteLost();

    // As of the last of these calls.
    bool IsHeld() const { return is_held_; }
    // Whether since the last call this host has gained the lease, or hosts were added or removed: the recordings that
    // others have left unfinished may be this host's to recover now. True for a change of hosts once offline_us have
    // passed, within which a removed host has noticed that it must not record any more.
    bool ConsumeChange();

  private:
    bool Take(store::Store& store, std::int64_t now_us);
    void LookAtHosts(store::Store& store, std::int64_t now_us);

    const int mount_id_;
    const int host_;
    const std::int64_t offline_us_;
    HostWatch host_watch_;
    HostWatch lease_watch_;  // of the lease's count, as a heartbeat of its holder
    std::set<int> hosts_;    // that share the store
    std::optional<std::int64_t> hosts_changed_us_;
    bool is_held_ = false;
    bool has_changed_ = false;
};

}  // namespace lookhaven::recorder
