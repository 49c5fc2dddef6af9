// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recorder_lease.h"

#include <tuple>

#include "standalone/base/host_name.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<LeaseState> {
    static constexpr const char* kTable = "recorder_lease";
    static constexpr const char* kColumns = "count, holder, first_reserved_id";
    static auto Members(auto& state) { return std::tie(state.count, state.holder, state.first_reserved_id); }
};

std::string RecorderName(const base::Installation& installation) {
    return installation.Home().string() + " on " + base::OwnHostName();
}

LeaseState RecorderLease::Current() {
    return connection_.FetchOne<LeaseState>("").value_or(LeaseState{});
}

bool RecorderLease::Take(std::int64_t count, const std::string& holder, int first_reserved_id) {
    return connection_.Write(
        [&](soci::session& sql) {
            return Execute(sql,
                           "update recorder_lease set count = count + 1, holder = :holder, first_reserved_id = :first"
                           " where count = :count",
                           holder, first_reserved_id, count) > 0;
        },
        Durability::kLazy);
}

void RecorderLease::Release(std::int64_t count, const std::string& holder) {
    connection_.Write(
        [&](soci::session& sql) {
            Execute(sql,
                    "update recorder_lease set count = count + 1, holder = ''"
                    " where count = :count and holder = :holder",
                    count, holder);
        },
        Durability::kLazy);
}

}  // namespace lookhaven::store
