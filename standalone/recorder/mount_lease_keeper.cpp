// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/mount_lease_keeper.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <utility>

#include "standalone/base/log.h"
#include "standalone/store/hosts.h"

namespace lookhaven::recorder {

void MountLeaseKeeper::Update(store::Store& store, std::int64_t now_us) {
    LookAtHosts(store, now_us);
    const bool was_held = std::exchange(is_held_, Take(store, now_us));
    if (is_held_ != was_held) {
        has_changed_ |= is_held_;
        base::LogInfo("mount " + std::to_string(mount_id_) +
                      (is_held_ ? ": this host maintains it now" : ": another host maintains it now"));
    }
}

void MountLeaseKeeper::GiveUp(store::Store& store) {
    is_held_ = false;
    store::SharedMounts(store).Release(mount_id_, host_);  // also one that an earlier recorder has left
}

bool MountLeaseKeeper::TakeChange() {
    return std::exchange(has_changed_, false);
}

bool MountLeaseKeeper::Take(store::Store& store, std::int64_t now_us) {
    store::SharedMounts shared(store);
    if (shared.Renew(mount_id_, host_)) {
        return true;
    }
    const store::MountLease lease = shared.Lease(mount_id_);
    if (lease.host_id == 0) {
        return shared.TakeFree(mount_id_, host_);
    }
    watch_.Observe({{.id = lease.host_id, .heartbeat = lease.count}}, now_us);
    return !watch_.IsOnline(lease.host_id) && shared.TakeOver(mount_id_, host_, lease);
}

void MountLeaseKeeper::LookAtHosts(store::Store& store, std::int64_t now_us) {
    std::set<int> ids;
    std::ranges::transform(store::Hosts(store).All(), std::inserter(ids, ids.end()), &store::Host::id);
    if (std::exchange(hosts_, ids) != ids) {
        hosts_changed_us_ = now_us;
    } else if (hosts_changed_us_ && now_us - *hosts_changed_us_ >= offline_us_) {
        hosts_changed_us_.reset();
        has_changed_ = true;
    }
}

}  // namespace lookhaven::recorder
