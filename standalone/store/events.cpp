// SPDX-License-Identifier: Apache-2.0
//
// Changes of events; event_search.cpp reads them.
#include "standalone/store/events.h"

#include <algorithm>
#include <limits>
#include <string>
#include <vector>

#include "standalone/store/connection.h"
#include "standalone/store/event_row.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<EventIdBlock> {
    static auto Members(auto& block) { return std::tie(block.first_id, block.ids, block.host_id); }
};

namespace {

constexpr std::size_t kMaxPathBytes = 1024;
constexpr std::size_t kMaxCodecBytes = 32;
constexpr int kBlocksOfHost = 4096;
constexpr int kRowsPerBatch = 10'000;
constexpr int kMovedRowsPerBatch = 1'000;
constexpr std::size_t kIdsPerStatement = 1'000;  // far less than a statement may take

void RequireSpan(std::int64_t start_s, std::int64_t end_s) {
    if (start_s < 0 || end_s < start_s || end_s - start_s > base::kMaxRecordingSeconds) {
        throw InvalidRecord("an event ends at most 7200 seconds after it starts, and not before");
    }
}

void RequireEvent(const Event& event) {
    RequireSpan(event.start_s, event.end_s);
    if (event.camera_id < 1 || event.mount_id < 1 || event.frame_count < 0 || event.size_bytes < 0) {
        throw InvalidRecord("an event needs a camera and a mount, and no id below 0");
    }
    if (!IsPlainText(event.path, kMaxPathBytes) || !IsPlainText(event.audio_codec, kMaxCodecBytes)) {
        throw InvalidRecord("an event's path and codec are UTF-8 without control characters");
    }
}

Event WithOrder(Event event) {
    event.order = event.order == kOrderOfId ? event.id : event.order;
    return event;
}

// Runs the text (without " where …") for the rows of those ids that meet the conditions (" and …", or ""); returns how
// many. On PostgreSQL many at once, since a trigger runs for each statement.
int ForIds(Connection& connection, soci::session& sql, std::span<const int> ids, const std::string& text,
           const std::string& conditions = "") {
    int changed = 0;
    if (!connection.IsSqlite()) {
        for (; !ids.empty(); ids = ids.subspan(std::min(ids.size(), kIdsPerStatement))) {
            changed += Execute(sql, text + " where id = any (cast(:ids as integer[]))" + conditions,
                               ArrayText(ids.first(std::min(ids.size(), kIdsPerStatement))));
        }
        return changed;
    }
    int id = 0;
    soci::statement statement = Prepare(sql, kRepeatedly, text + " where id = :id" + conditions, id);
    for (const int next : ids) {
        id = next;
        changed += Run(statement);
    }
    return changed;
}

// Returns how many were moved.
int Move(Connection& connection, std::span<const int> ids, const std::string& from, const std::string& to,
         const std::string& conditions) {
    const std::string columns = Mapping<Event>::kColumns;
    return connection.Write([&](soci::session& sql) {
        const int copied =
            ForIds(connection, sql, ids, "insert into " + to + " (" + columns + ") select " + columns + " from " + from,
                   conditions);
        ForIds(connection, sql, ids, "delete from " + from, conditions + " and id in (select id from " + to + ")");
        // On PostgreSQL a row may have come to meet the conditions, or no longer to meet them, between the two.
        return copied - ForIds(connection, sql, ids, "delete from " + to, " and id in (select id from " + from + ")");
    });
}

int GrowEach(soci::session& sql, std::span<const Event> events) {
    Event row;
    std::int64_t first_start_s = 0;
    soci::statement update =
        Prepare(sql, kRepeatedly,
                "update events set end_s = :end, frame_count = :frames, size_bytes = :size, recording = 1"
                " where id = :id and start_s between :first and :last",
                row.end_s, row.frame_count, row.size_bytes, row.id, first_start_s, row.end_s);
    int changed = 0;
    for (const Event& event : events) {
        row = event;
        first_start_s = row.end_s - base::kMaxRecordingSeconds;
        changed += Run(update);
    }
    return changed;
}

// For PostgreSQL, which would plan the statement of GrowEach anew for each row, to find the row's partitions.
int GrowAtOnce(soci::session& sql, std::span<const Event> events) {
    if (events.empty()) {
        return 0;
    }
    std::vector<int> ids;
    std::vector<std::int64_t> ends_s;
    std::vector<int> frame_counts;
    std::vector<std::int64_t> sizes_bytes;
    for (const Event& event : events) {
        ids.push_back(event.id);
        ends_s.push_back(event.end_s);
        frame_counts.push_back(event.frame_count);
        sizes_bytes.push_back(event.size_bytes);
    }
    // One range for all rows, by which the planner leaves out partitions.
    const auto [first_end_s, last_end_s] = std::ranges::minmax(ends_s);
    const std::int64_t first_start_s = first_end_s - base::kMaxRecordingSeconds;
    return Execute(sql,
                   "update events set end_s = grown.end_s, frame_count = grown.frame_count,"
                   " size_bytes = grown.size_bytes, recording = 1 from unnest(cast(:ids as integer[]),"
                   " cast(:ends as bigint[]), cast(:frames as integer[]), cast(:sizes as bigint[]))"
                   " as grown (id, end_s, frame_count, size_bytes) where events.id = grown.id"
                   " and start_s between grown.end_s - :longest and grown.end_s and start_s between :first and :last",
                   ArrayText(ids), ArrayText(ends_s), ArrayText(frame_counts), ArrayText(sizes_bytes),
                   base::kMaxRecordingSeconds, first_start_s, last_end_s);
}

}  // namespace

int Events::NextId() {
    return connection_.Write([](soci::session& sql) { return store::NextId(sql, "event"); });
}

int Events::NextIds(int count) {
    return connection_.Write([&](soci::session& sql) { return store::NextIds(sql, "event", count); });
}

int Events::ReserveIds(int count, int host) {
    return connection_.Write([&](soci::session& sql) {
        const int first = store::NextIds(sql, "event", count);
        Execute(sql, "insert into event_id_blocks (first_id, ids, host_id) values (:first, :ids, :host)", first, count,
                host);
        Execute(sql,
                "delete from event_id_blocks where host_id = :host and first_id <= (select first_id"
                " from event_id_blocks where host_id = :same order by first_id desc limit 1 offset :blocks)",
                host, host, kBlocksOfHost);
        return first;
    });
}

std::vector<EventIdBlock> Events::ReservedBlocks() {
    return connection_.FetchAll<EventIdBlock>("select first_id, ids, host_id from event_id_blocks");
}

void Events::Begin(const Event& event) {
    RequireEvent(event);
    connection_.Write([&](soci::session& sql) {
        if (Exists(sql, "select id from events where id = :id", event.id)) {
            throw AlreadyExists("there is already an event " + std::to_string(event.id));
        }
        Insert(sql, WithOrder(event));
    });
}

void Events::AddAll(std::span<const Event> events) {
    std::ranges::for_each(events, RequireEvent);
    connection_.Write([&](soci::session& sql) {
        int id = store::NextIds(sql, "event", static_cast<int>(events.size()));
        Event row;
        soci::statement insert = PrepareInsert(sql, kRepeatedly, row);
        for (const Event& event : events) {
            row = event;
            row.id = id++;
            row.order = row.id;
            Run(insert);
        }
    });
}

bool Events::Finish(int id, std::int64_t end_s, int frame_count, std::int64_t size_bytes) {
    return connection_.Write([&](soci::session& sql) {
        const auto start_s = FetchOne<std::int64_t>(sql, "select start_s from events where id = :id", id);
        if (!start_s) {
            return false;
        }
        RequireSpan(*start_s, end_s);
        return Execute(sql,
                       "update events set end_s = :end, frame_count = :frames, size_bytes = :size, recording = 0"
                       " where id = :id and start_s = :start",
                       end_s, frame_count, size_bytes, id, *start_s) > 0;
    });
}

int Events::Grow(std::span<const Event> events) {
    return connection_.Write(
        [&](soci::session& sql) { return connection_.IsSqlite() ? GrowEach(sql, events) : GrowAtOnce(sql, events); },
        Durability::kLazy);
}

int Events::Remove(std::span<const int> ids) {
    return connection_.Write([&](soci::session& sql) { return ForIds(connection_, sql, ids, "delete from events"); });
}

int Events::BeginDeletion(std::span<const int> ids) {
    return Move(connection_, ids, "events", "events_pending_deletion", " and recording = 0 and archived = 0");
}

void Events::BeginDeletionOfCamera(int camera_id) {
    const std::string columns = Mapping<Event>::kColumns;
    const std::string all = " from events where camera_id = :camera and (demo = 1 or (recording = 0 and archived = 0))";
    const std::string next = all + " and start_s <= :start";
    for (bool is_last = false; !is_last;) {
        connection_.Write([&](soci::session& sql) {
            const auto start_s =
                FetchOne<std::int64_t>(sql, "select start_s" + all + " order by start_s limit 1 offset :rows",
                                       camera_id, kMovedRowsPerBatch - 1);
            const std::int64_t last_s = start_s.value_or(std::numeric_limits<std::int64_t>::max());
            Execute(sql,
                    "insert into events_pending_deletion (" + columns + ") select " + columns + next + " and demo = 0",
                    camera_id, last_s);
            // As in Move.
            Execute(sql, "delete" + next + " and (demo = 1 or id in (select id from events_pending_deletion))",
                    camera_id, last_s);
            Execute(sql,
                    "delete from events_pending_deletion where id in"
                    " (select id from events where camera_id = :camera and start_s <= :start)",
                    camera_id, last_s);
            is_last = !start_s;
        });
    }
}

void Events::FinishDeletion(std::span<const int> ids) {
    connection_.Write(
        [&](soci::session& sql) { ForIds(connection_, sql, ids, "delete from events_pending_deletion"); });
}

void Events::SetMissingOrders(int mount_id) {
    connection_.Execute("update events set recording_order = id where mount_id = :mount and recording_order = :missing",
                        mount_id, std::numeric_limits<std::int64_t>::max());
}

void Events::CancelDeletion(std::span<const int> ids) {
    Move(connection_, ids, "events_pending_deletion", "events", "");
}

int Events::RemoveDemo() {
    int removed = 0;
    for (const char* statement : {"delete from events where id in (select id from events where demo = 1 limit :limit)",
                                  "delete from marks where id in (select id from marks where demo = 1 limit :limit)"}) {
        while (const int some = connection_.Execute(statement, kRowsPerBatch)) {
            removed += some;
        }
    }
    return removed;
}

}  // namespace lookhaven::store
