// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/shared_mounts.h"

#include <string>
#include <tuple>

#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<MountLease> {
    static auto Members(auto& lease) { return std::tie(lease.host_id, lease.count); }
};

namespace {

constexpr const char* kRenew = "update mount_leases set count = count + 1 where mount_id = :mount and host_id = :host";

}  // namespace

void SharedMounts::SetPresence(int mount_id, int host, bool is_there) {
    if (!is_there) {
        connection_.Execute("delete from shared_mount_hosts where mount_id = :mount and host_id = :host", mount_id,
                            host);
        Release(mount_id, host);
        return;
    }
    connection_.Execute("insert into shared_mount_hosts (mount_id, host_id) select mounts.id, hosts.id"
                        " from mounts, hosts where mounts.id = :mount and hosts.id = :host"
                        " on conflict (mount_id, host_id) do nothing",
                        mount_id, host);
}

std::vector<int> SharedMounts::HostsWith(int mount_id) {
    return connection_.FetchAll<int>("select host_id from shared_mount_hosts where mount_id = :mount order by host_id",
                                     mount_id);
}

MountLease SharedMounts::Lease(int mount_id) {
    return connection_.FetchOne<MountLease>("select host_id, count from mount_leases where mount_id = :mount", mount_id)
        .value_or(MountLease());
}

bool SharedMounts::Renew(int mount_id, int host) {
    return connection_.Write([&](soci::session& sql) { return Execute(sql, kRenew, mount_id, host); },
                             Durability::kLazy) > 0;
}

bool SharedMounts::TakeFree(int mount_id, int host) {
    return connection_.Execute("insert into mount_leases (mount_id, host_id) select mounts.id, hosts.id"
                               " from mounts, hosts where mounts.id = :mount and hosts.id = :host"
                               " on conflict (mount_id) do nothing",
                               mount_id, host) > 0;
}

bool SharedMounts::TakeOver(int mount_id, int host, const MountLease& stale) {
    return connection_.Execute("update mount_leases set host_id = :host, count = count + 1 where mount_id = :mount"
                               " and host_id = :former and count = :count",
                               host, mount_id, stale.host_id, stale.count) > 0;
}

void SharedMounts::Release(int mount_id, int host) {
    connection_.Execute("delete from mount_leases where mount_id = :mount and host_id = :host", mount_id, host);
}

void SharedMounts::ChangeWithLease(int mount_id, int host, const std::function<void()>& change) {
    connection_.Write([&](soci::session& sql) {
        if (Execute(sql, kRenew, mount_id, host) == 0) {
            throw LeaseLost("another host maintains mount " + std::to_string(mount_id) + " now");
        }
        change();
    });
}

std::int64_t SharedMounts::ServerTimeS() {
    return connection_.FetchOne<std::int64_t>("select cast(extract(epoch from now()) as bigint)").value();
}

}  // namespace lookhaven::store
