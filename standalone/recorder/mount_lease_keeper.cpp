// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/mount_lease_keeper.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <utility>
#include <vector>

#include "standalone/base/log.h"
#include "standalone/store/hosts.h"

namespace lookhaven::recorder {

void MountLeaseKeeper::Update(store::Store& store, std::int64_t now_us) {
    LookAtHosts(store, now_us);
    if (!Take(store, now_us)) {
        NoteLost();
    } else if (!std::exchange(is_held_, true)) {
        has_changed_ = true;
        base::LogInfo("mount " + std::to_string(mount_id_) + ": this host maintains it now");
    }
}

void MountLeaseKeeper::NoteLost() {
    if (std::exchange(is_held_, false)) {
        base::LogInfo("mount " + std::to_string(mount_id_) + ": this host does not maintain it any more");
    }
}

void MountLeaseKeeper::GiveUp(store::Store& store) {
    NoteLost();
    store::SharedMounts(store).Release(mount_id_, host_);  // also one that an earlier recorder has left
}

bool MountLeaseKeeper::ConsumeChange() {
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
    lease_watch_.Observe({{.id = lease.host_id, .heartbeat = lease.count}}, now_us);
    const bool is_stale = !host_watch_.IsOnline(lease.host_id) || !lease_watch_.IsOnline(lease.host_id);
    return is_stale && shared.TakeOver(mount_id_, host_, lease);
}

void MountLeaseKeeper::LookAtHosts(store::Store& store, std::int64_t now_us) {
    const std::vector<store::Host> hosts = store::Hosts(store).All();
    host_watch_.Observe(hosts, now_us);
    std::set<int> ids;
    std::ranges::transform(hosts, std::inserter(ids, ids.end()), &store::Host::id);
    if (std::exchange(hosts_, ids) != ids) {
        hosts_changed_us_ = now_us;
    } else if (hosts_changed_us_ && now_us - *hosts_changed_us_ >= offline_us_) {
        hosts_changed_us_.reset();
        has_changed_ = true;
    }
}

}  // namespace lookhaven::recorder
