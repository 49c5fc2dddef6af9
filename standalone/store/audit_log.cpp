// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/audit_log.h"

#include <limits>

#include "standalone/store/connection.h"

namespace lookhaven::store {

template <>
struct Mapping<AuditEntry> {
    static constexpr const char* kTable = "audit_log";
    static constexpr const char* kColumns =
        "id, time_s, user_id, who, address, action, object, before_change, after_change";
    static auto Members(auto& entry) {
        return std::tie(entry.id, entry.time_s, entry.user_id, entry.who, entry.address, entry.action, entry.object,
                        entry.before, entry.after);
    }
};

int AuditLog::Add(AuditEntry entry) {
    return connection_.Write([&](soci::session& sql) {
        entry.id = NextId(sql, "audit");
        Insert(sql, entry);
        Execute(sql, "delete from audit_log where id <= :last", entry.id - max_entries_);
        return entry.id;
    });
}

std::vector<AuditEntry> AuditLog::List(int before_id, int limit) {
    return connection_.FetchAll<AuditEntry>("where id < :before order by id desc limit :limit",
                                            before_id > 0 ? before_id : std::numeric_limits<int>::max(), limit);
}

}  // namespace lookhaven::store
