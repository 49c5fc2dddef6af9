// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recorder_lease.h"

#include <tuple>

#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<RecorderRole> {
    static constexpr const char* kTable = "recorder_lease";
    static constexpr const char* kColumns = "count, holder, first_own_id";
    static auto Members(auto& role) { return std::tie(role.count, role.holder, role.first_own_id); }
};

RecorderRole RecorderLease::Current() {
    return connection_.FetchOne<RecorderRole>("").value_or(RecorderRole{});
}

bool RecorderLease::Take(std::int64_t count, const std::string& holder, int first_own_id) {
    return connection_.Write(
        [&](soci::session& sql) {
            return Execute(sql,
                           "update recorder_lease set count = count + 1, holder = :holder, first_own_id = :first"
                           " where count = :count",
                           holder, first_own_id, count) > 0;
        },
        Durability::kLazy);
}

}  // namespace lookhaven::store
