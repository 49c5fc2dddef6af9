// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/kept_events.h"

#include <tuple>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/query.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<Keeping> {
    static constexpr const char* kTable = "kept_events";
    static constexpr const char* kColumns = "note, keeper, kept_s";
    static auto Members(auto& keeping) { return std::tie(keeping.note, keeping.keeper, keeping.kept_s); }
};

int KeptEvents::Keep(std::span<const int> event_ids, const Keeping& keeping) {
    if (!IsPlainText(keeping.note, kMaxKeepNoteBytes)) {
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
                        id, keeping.note, keeping.keeper, keeping.kept_s);
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

std::optional<Keeping> KeptEvents::Find(int event_id) {
    return connection_.FetchOne<Keeping>("where event_id = :id", event_id);
}

std::map<int, Keeping> KeptEvents::FindBetween(int first_event_id, int last_event_id) {
    return connection_.FetchAll<std::pair<int, Keeping>, std::map<int, Keeping>>(
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
