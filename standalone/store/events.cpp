// SPDX-License-Identifier: Apache-2.0
//
// Changes of events; event_search.cpp reads them.
#include "standalone/store/events.h"

#include <algorithm>

#include "standalone/store/connection.h"
#include "standalone/store/event_row.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxPathBytes = 1024;
constexpr std::size_t kMaxCodecBytes = 32;
constexpr int kRowsAtOnce = 10'000;

void RequireSpan(std::int64_t start_s, std::int64_t end_s) {
    if (start_s < 0 || end_s < start_s || end_s - start_s > base::kMaxRecordingSeconds) {
        throw InvalidRecord("an event ends at most 7200 seconds after it starts, and not before");
    }
}

void RequireEvent(const Event& event) {
    RequireSpan(event.start_s, event.end_s);
    if (event.camera_id < 1 || event.mount_id < 1 || event.frame_count < 0 || event.size_bytes < 0) {
        throw InvalidRecord("an event has a camera and a mount, and no number below 0");
    }
    if (!IsPlainText(event.path, kMaxPathBytes) || !IsPlainText(event.audio_codec, kMaxCodecBytes)) {
        throw InvalidRecord("an event's path and codec are UTF-8 without control characters");
    }
}

// The one statement that makes rows; the row outlives it.
soci::statement PrepareInsert(soci::session& sql, const EventRow& row) {
    const Event& event = row.event;
    return (
        sql.prepare << "insert into events (id, camera_id, mount_id, start_s, end_s, recording, reason, frame_count,"
                       " size_bytes, video_type, audio_codec, width, height, path, archived, demo)"
                       " values (:id, :camera, :mount, :start, :end, :recording, :reason, :frames, :size, :type,"
                       " :codec, :width, :height, :path, :archived, :demo)",
        soci::use(event.id, "id"), soci::use(event.camera_id, "camera"), soci::use(event.mount_id, "mount"),
        soci::use(row.start, "start"), soci::use(row.end, "end"), soci::use(row.recording, "recording"),
        soci::use(event.reason, "reason"), soci::use(event.frame_count, "frames"), soci::use(row.size, "size"),
        soci::use(row.video_type, "type"), soci::use(event.audio_codec, "codec"), soci::use(event.width, "width"),
        soci::use(event.height, "height"), soci::use(event.path, "path"), soci::use(row.archived, "archived"),
        soci::use(row.demo, "demo"));
}

bool Affects(soci::statement& change) {
    change.execute(true);
    return change.get_affected_rows() > 0;
}

bool SetProgress(Connection& connection, int id, std::int64_t end_s, int frame_count, std::int64_t size_bytes,
                 bool recording) {
    const Durability durability = recording ? Durability::kLazy : Durability::kSafe;
    return connection.Write(
        [&](soci::session& sql) {
            Number start = 0;
            sql << "select start_s from events where id = :id", soci::use(id, "id"), soci::into(start);
            if (!sql.got_data()) {
                return false;
            }
            RequireSpan(start, end_s);
            const Number end = end_s;
            const Number size = size_bytes;
            const int goes_on = recording;
            soci::statement change = (sql.prepare << "update events set end_s = :end, frame_count = :frames,"
                                                     " size_bytes = :size, recording = :recording where id = :id",
                                      soci::use(end, "end"), soci::use(frame_count, "frames"), soci::use(size, "size"),
                                      soci::use(goes_on, "recording"), soci::use(id, "id"));
            return Affects(change);
        },
        durability);
}

}  // namespace

int Events::NextId() {
    return connection_.Write([](soci::session& sql) { return lookhaven::store::NextId(sql, "event"); });
}

int Events::NextIds(int count) {
    return connection_.Write([&](soci::session& sql) { return lookhaven::store::NextIds(sql, "event", count); });
}

void Events::Begin(const Event& event) {
    RequireEvent(event);
    connection_.Write([&](soci::session& sql) {
        int found = 0;
        sql << "select id from events where id = :id", soci::use(event.id, "id"), soci::into(found);
        if (sql.got_data()) {
            throw AlreadyExists("there is already an event " + std::to_string(event.id));
        }
        const EventRow row(event);
        PrepareInsert(sql, row).execute(true);
    });
}

void Events::AddAll(std::span<const Event> events) {
    std::ranges::for_each(events, RequireEvent);
    connection_.Write([&](soci::session& sql) {
        int id = lookhaven::store::NextIds(sql, "event", static_cast<int>(events.size()));
        EventRow row;
        soci::statement insert = PrepareInsert(sql, row);
        for (const Event& event : events) {
            row.Assign(event);
            row.event.id = id++;
            insert.execute(true);
        }
    });
}

bool Events::Grow(int id, std::int64_t end_s, int frame_count, std::int64_t size_bytes) {
    return SetProgress(connection_, id, end_s, frame_count, size_bytes, true);
}

bool Events::Finish(int id, std::int64_t end_s, int frame_count, std::int64_t size_bytes) {
    return SetProgress(connection_, id, end_s, frame_count, size_bytes, false);
}

bool Events::SetArchived(int id, bool archived) {
    return connection_.Write([&](soci::session& sql) {
        const int value = archived;
        soci::statement change = (sql.prepare << "update events set archived = :archived where id = :id",
                                  soci::use(value, "archived"), soci::use(id, "id"));
        return Affects(change);
    });
}

int Events::Remove(std::span<const int> ids) {
    return connection_.Write([&](soci::session& sql) {
        int id = 0;
        int removed = 0;
        soci::statement removal = (sql.prepare << "delete from events where id = :id", soci::use(id, "id"));
        for (const int next : ids) {
            id = next;
            removed += Affects(removal) ? 1 : 0;
        }
        return removed;
    });
}

int Events::RemoveDemo() {
    long long removed = 0;
    for (const char* statement : {"delete from events where id in (select id from events where demo = 1 limit :limit)",
                                  "delete from marks where id in (select id from marks where demo = 1 limit :limit)"}) {
        long long some = 0;
        do {
            some = connection_.Write([&](soci::session& sql) {
                soci::statement removal = (sql.prepare << statement, soci::use(kRowsAtOnce, "limit"));
                removal.execute(true);
                return removal.get_affected_rows();
            });
            removed += some;
        } while (some > 0);
    }
    return static_cast<int>(removed);
}

}  // namespace lookhaven::store
