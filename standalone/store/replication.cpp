// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/replication.h"

#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<Replication> {
    static auto Members(auto& replication) {
        return std::tie(replication.is_standby, replication.standbys, replication.visible, replication.streaming,
                        replication.lag_bytes);
    }
};

std::optional<Replication> ReadReplication(Store& store) {
    if (store.IsSqlite()) {
        return std::nullopt;
    }
    // A standby has no write position of its own in the log.
    return store.connection().FetchOne<Replication>(
        "select cast(pg_is_in_recovery() as integer), cast(count(*) as integer), cast(count(state) as integer),"
        " cast(count(*) filter (where state = 'streaming') as integer),"
        " cast(coalesce(max(pg_wal_lsn_diff(case when pg_is_in_recovery() then pg_last_wal_receive_lsn()"
        " else pg_current_wal_lsn() end, replay_lsn)) filter (where state = 'streaming'), 0) as bigint)"
        " from pg_stat_replication");
}

}  // namespace lookhaven::store
