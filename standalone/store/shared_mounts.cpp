// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/shared_mounts.h"

#include "standalone/store/connection.h"

namespace lookhaven::store {

void SharedMounts::NotePresence(int mount_id, int host, bool is_there) {
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

int SharedMounts::Maintainer(int mount_id) {
    return connection_.FetchOne<int>("select host_id from mount_leases where mount_id = :mount", mount_id).value_or(0);
}

bool SharedMounts::Take(int mount_id, int host, const Host& silent) {
    if (silent.id == 0) {
        return connection_.Execute("insert into mount_leases (mount_id, host_id) select mounts.id, hosts.id"
                                   " from mounts, hosts where mounts.id = :mount and hosts.id = :host"
                                   " on conflict (mount_id) do nothing",
                                   mount_id, host) > 0;
    }
    return connection_.Execute("update mount_leases set host_id = :host where mount_id = :mount and host_id = :silent"
                               " and exists (select 1 from hosts where id = :id and heartbeat = :heartbeat)",
                               host, mount_id, silent.id, silent.id, silent.heartbeat) > 0;
}

void SharedMounts::Release(int mount_id, int host) {
    connection_.Execute("delete from mount_leases where mount_id = :mount and host_id = :host", mount_id, host);
}

}  // namespace lookhaven::store
