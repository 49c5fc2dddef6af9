// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recorder_lease.h"

#include <tuple>

#include "standalone/base/host_name.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<LeaseState> {
    static auto Members(auto& state) { return std::tie(state.count, state.holder, state.first_reserved_id); }
};

std::string RecorderName(const base::Installation& installation) {
    return installation.Home().string() + " on " + base::OwnHostName();
}

RecorderLease::RecorderLease(Store& store, int host) : connection_(store.connection()), host_(host) {}

LeaseState AnyRecorder(Store& store) {
    return store.connection()
        .FetchOne<LeaseState>("select count, holder, first_reserved_id from recorder_lease where holder <> ''"
                              " union select heartbeat, holder, first_reserved_id from hosts where holder <> ''"
                              " order by 3 limit 1")
        .value_or(LeaseState{});
}

LeaseState RecorderLease::Current() {
    const char* columns = "select count, holder, first_reserved_id from recorder_lease";
    const std::optional<LeaseState> state =
        host_ == 0 ? connection_.FetchOne<LeaseState>(columns)
                   : connection_.FetchOne<LeaseState>(
                         "select heartbeat, holder, first_reserved_id from hosts where id = :host", host_);
    return state.value_or(LeaseState{});
}

bool RecorderLease::Take(std::int64_t count, const std::string& holder, int first_reserved_id) {
    return connection_.Write(
        [&](soci::session& sql) {
            const int taken = host_ == 0
                                  ? Execute(sql,
                                            "update recorder_lease set count = count + 1, holder = :holder,"
                                            " first_reserved_id = :first where count = :count",
                                            holder, first_reserved_id, count)
                                  : Execute(sql,
                                            "update hosts set heartbeat = heartbeat + 1, holder = :holder,"
                                            " first_reserved_id = :first where heartbeat = :count and id = :host",
                                            holder, first_reserved_id, count, host_);
            return taken > 0;
        },
        Durability::kLazy);
}

void RecorderLease::Release(std::int64_t count, const std::string& holder) {
    connection_.Write(
        [&](soci::session& sql) {
            if (host_ == 0) {
                Execute(sql,
                        "update recorder_lease set count = count + 1, holder = ''"
                        " where count = :count and holder = :holder",
                        count, holder);
            } else {
                Execute(sql,
                        "update hosts set heartbeat = heartbeat + 1, holder = ''"
                        " where heartbeat = :count and holder = :holder and id = :host",
                        count, holder, host_);
            }
        },
        Durability::kLazy);
}

}  // namespace lookhaven::store
