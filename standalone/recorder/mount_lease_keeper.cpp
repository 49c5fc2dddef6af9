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

void MountLeaseKeeper::Renew(store::Store& store, std::int64_t now_us) {
    const bool was_held = std::exchange(is_held_, Take(store, now_us));
    if (is_held_ && !was_held) {
        has_changed_ = true;
        base::LogInfo("maintains the shared mount " + std::to_string(mount_id_));
    }
}

void MountLeaseKeeper::GiveUp(store::Store& store) {
    if (std::exchange(is_held_, false)) {
        store::SharedMounts(store).Release(mount_id_, host_);
    }
}

bool MountLeaseKeeper::HasChanged() {
    return std::exchange(has_changed_, false);
}

bool MountLeaseKeeper::Take(store::Store& store, std::int64_t now_us) {
    const std::vector<store::Host> hosts = store::Hosts(store).All();
    watch_.Observe(hosts, now_us);
    std::set<int> ids;
    std::ranges::transform(hosts, std::inserter(ids, ids.end()), &store::Host::id);
    has_changed_ |= std::exchange(hosts_, ids) != ids;
    store::SharedMounts shared(store);
    const int holder = shared.Maintainer(mount_id_);
    if (holder == 0 || holder == host_) {
        return holder != 0 || shared.Take(mount_id_, host_);
    }
    const auto host = std::ranges::find(hosts, holder, &store::Host::id);
    return host != hosts.end() && !watch_.IsOnline(holder) && shared.Take(mount_id_, host_, *host);
}

}  // namespace lookhaven::recorder
