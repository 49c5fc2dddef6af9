// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/camera_leases.h"

#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<CameraLease> {
    static auto Members(auto& lease) {
        return std::tie(lease.camera_id, lease.enabled, lease.fixed_host_id, lease.host_id, lease.count,
                        lease.next_host_id, lease.bytes_per_second);
    }
};

namespace {

// Also locks the host's row until the end: a heartbeat comes either before this, which sees it, or after the lease has
// changed hands, which the host sees then.
bool IsSilent(soci::session& sql, int host, std::int64_t heartbeat) {
    return Execute(sql, "update hosts set heartbeat = heartbeat where id = :id and heartbeat = :seen", host,
                   heartbeat) > 0 ||
           !Exists(sql, "select id from hosts where id = :id", host);
}

}  // namespace

std::vector<CameraLease> CameraLeases::List() {
    return connection_.FetchAll<CameraLease>(
        "select cameras.id, cameras.enabled, cameras.host_id, coalesce(camera_leases.host_id, 0),"
        " coalesce(camera_leases.count, 0), coalesce(camera_leases.next_host_id, 0),"
        " coalesce(camera_leases.bytes_per_second, 0)"
        " from cameras left join camera_leases on camera_id = id order by cameras.id");
}

bool CameraLeases::Take(const CameraLease& seen, int host, std::int64_t silent_heartbeat) {
    return connection_.Write([&](soci::session& sql) {
        if (seen.host_id != 0 && !IsSilent(sql, seen.host_id, silent_heartbeat)) {
            return false;
        }
        if (seen.count == 0) {
            return Execute(sql,
                           "insert into camera_leases (camera_id, host_id, count, next_host_id)"
                           " select id, cast(:host as integer), 1, 0 from cameras where id = :camera"
                           " on conflict (camera_id) do nothing",
                           host, seen.camera_id) > 0;
        }
        return Execute(sql,
                       "update camera_leases set host_id = :host, count = count + 1, next_host_id = 0"
                       " where camera_id = :camera and count = :count",
                       host, seen.camera_id, seen.count) > 0;
    });
}

void CameraLeases::Release(int camera, int host) {
    connection_.Execute("update camera_leases set host_id = 0, count = count + 1"
                        " where camera_id = :camera and host_id = :host",
                        camera, host);
}

void CameraLeases::SetRates(int host, const std::map<int, std::int64_t>& bytes_per_second) {
    connection_.Write(
        [&](soci::session& sql) {
            for (const auto& [camera, rate] : bytes_per_second) {
                Execute(
                    sql,
                    "update camera_leases set bytes_per_second = :rate where camera_id = :camera and host_id = :host",
                    rate, camera, host);
            }
        },
        Durability::kLazy);
}

void CameraLeases::Move(int camera, int next_host) {
    connection_.Execute("update camera_leases set next_host_id = :next where camera_id = :camera", next_host, camera);
}

}  // namespace lookhaven::store
