// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/kept_events.h"

#include <tuple>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/query.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<KeepRecord> {
    static constexpr const char* kTable = "kept_events";
    static constexpr const char* kColumns = "note, keeper, kept_s";
    static auto Members(auto& record) { return std::tie(record.note, record.keeper, record.kept_s); }
};

int KeptEvents::Keep(std::span<const int> event_ids, const KeepRecord& record) {
    if (!IsPlainText(record.note, kMaxKeepNoteBytes)) {
        throw InvalidRecord("a note is UTF-8 without control characters, at most 500 bytes");
    }
    return connection_.Write([&](soci::session& sql) {
        int kept = 0;
        for (const int id : event_ids) {
            if (Execute(sql, "update events set archived = 1 where id = :id", id) > 0) {
                Execute(sql, "delete from kept_events where event_id = :id", id);
                Execute(sql,
                        "insert into kept_events (event_id, note, keeper, kept_s)"
                        " values (:id, :note, :keeper, :kept)",
                        id, record.note, record.keeper, record.kept_s);
                ++kept;
            }
        }
        return kept;
    });
}

int KeptEvents::Release(std::span<const int> event_ids) {
    return connection_.Write([&](soci::session& sql) {
        int released = 0;
        for (const int id : event_ids) {
            released += Execute(sql, "update events set archived = 0 where id = :id", id);
            Execute(sql, "delete from kept_events where event_id = :id", id);
        }
        return released;
    });
}

std::optional<KeepRecord> KeptEvents::Find(int event_id) {
    return connection_.FetchOne<KeepRecord>("where event_id = :id", event_id);
}

std::map<int, KeepRecord> KeptEvents::FindBetween(int first_event_id, int last_event_id) {
    return connection_.FetchAll<std::pair<int, KeepRecord>, std::map<int, KeepRecord>>(
        "select event_id, note, keeper, kept_s from kept_events where event_id >= :first and event_id <= :last",
        first_event_id, last_event_id);
}

std::int64_t KeptEvents::SizeBytes(int mount_id) {
    return connection_
        .FetchOne<std::int64_t>("select cast(coalesce(sum(size_bytes), 0) as bigint) from events"
                                " where mount_id = :mount and archived = 1 and demo = 0",
                                mount_id)
        .value();
}

}  // namespace lookhaven::store
