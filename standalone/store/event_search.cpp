// SPDX-License-Identifier: Apache-2.0
//
// Questions about events; events.cpp changes them.
#include <algorithm>
#include <limits>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/event_row.h"
#include "standalone/store/events.h"
#include "standalone/store/row_search.h"

namespace lookhaven::store {

namespace {

constexpr int kRowsPerBatch = 10'000;

// The starts to search: what starts earlier cannot reach into the filter's span.
StartSpan StartsOf(const EventFilter& filter) {
    return {std::max(filter.begin_s, base::kMaxRecordingSeconds) - base::kMaxRecordingSeconds, filter.end_s};
}

// The filter's rows that start then, camera by camera.
void Search(Connection& connection, soci::session& sql, const EventFilter& filter, StartSpan starts, std::int64_t limit,
            const auto& visit) {
    const std::string condition = " and end_s > :reached and :mount in (0, mount_id) and :reason in (0, reason)"
                                  " and (:finished = 0 or recording = 0)" +
                                  // As the condition of an index: kept events are few.
                                  std::string(filter.kept_only ? " and archived = 1" : "");
    ForEachCamera<Event>(connection, sql, filter.camera_ids, starts, filter.newest_first, limit, visit, condition,
                         filter.begin_s, filter.mount_id, filter.reason, filter.finished_only);
}

// With the reason in it as a number: that of kOthers is the condition of an index.
std::string ReasonText(Reasons reasons) {
    const std::string continuous = std::to_string(base::kReasonContinuous);
    return reasons == Reasons::kAny          ? ""
           : reasons == Reasons::kContinuous ? " and reason = " + continuous
                                             : " and reason <> " + continuous;
}

}  // namespace

std::optional<Event> Events::Find(int id) {
    return FindById<Event>(connection_, id, "");
}

std::vector<Event> Events::List(const EventFilter& filter) {
    return ListRows<Event>(connection_, filter, StartsOf(filter),
                           [&](soci::session& sql, StartSpan starts, std::int64_t limit, const auto& visit) {
                               Search(connection_, sql, filter, starts, limit, visit);
                           });
}

void Events::Visit(const EventFilter& filter, const Visitor& visitor) {
    connection_.Read([&](soci::session& sql) {
        Search(connection_, sql, filter, StartsOf(filter), std::numeric_limits<std::int64_t>::max(), visitor);
    });
}

std::optional<Event> Events::Next(const Step& step, Reasons reasons) {
    return NextRow<Event>(connection_, step, " and demo = 0" + ReasonText(reasons));
}

std::vector<Event> Events::Open() {
    return connection_.FetchAll<Event>("where recording = 1 order by id");
}

std::vector<Event> Events::PendingDeletion(int mount_id) {
    std::vector<Event> events;
    connection_.Read([&](soci::session& sql) {
        Query<EventPendingDeletion>(sql, kOnce, "where mount_id = :mount order by id", mount_id)
            .ForEach([&](const Event& event) { events.push_back(event); });
    });
    return events;
}

std::vector<Event> Events::InRecordingOrder(int mount_id, const Event& after, int limit, std::optional<int> camera_id) {
    const std::string mount = "where mount_id = :mount";
    const std::string behind =
        " and (recording_order, id) > (:after_order, :after_id) and recording = 0 and archived = 0 and demo = 0"
        " order by recording_order, id limit :limit";
    return camera_id ? connection_.FetchAll<Event>(mount + " and camera_id = :camera" + behind, mount_id, *camera_id,
                                                   after.order, after.id, limit)
                     : connection_.FetchAll<Event>(mount + behind, mount_id, after.order, after.id, limit);
}

std::optional<std::string> Events::PathPendingDeletion(int id) {
    return connection_.FetchOne<std::string>("select path from events_pending_deletion where id = :id", id);
}

std::int64_t Events::OrderForDate(int mount_id, std::int64_t start_s) {
    const std::set<int> cameras = CamerasOn(mount_id);
    const std::vector<Event> next = List({.camera_ids = cameras, .mount_id = mount_id, .begin_s = start_s, .limit = 1});
    if (next.empty()) {
        return kOrderOfId;
    }
    // What was recorded within a day before it: a single row that a wrong clock dated ahead does not make it old.
    std::int64_t order = next.front().order - 1;
    for (const int camera : cameras) {
        for (const Event& before : connection_.FetchAll<Event>(
                 "where camera_id = :camera and start_s < :start and start_s >= :earliest and mount_id = :mount"
                 " and demo = 0 order by start_s desc limit 1",
                 camera, start_s, start_s - 86'400, mount_id)) {
            order = std::max(order, before.order);
        }
    }
    return order;
}

void Events::VisitMount(int mount_id, const Visitor& visitor) {
    for (const int camera : CamerasOn(mount_id)) {
        int after = 0;
        std::vector<Event> page;
        do {
            page = connection_.FetchAll<Event>(
                "where mount_id = :mount and camera_id = :camera and id > :after order by id limit :limit", mount_id,
                camera, after, kRowsPerBatch);
            for (const Event& event : page) {
                after = event.id;
                if (!event.demo) {
                    visitor(event);
                }
            }
        } while (!page.empty());
    }
}

// Three parts, each of which has an index of its own; the sign keeps the third from taking another.
MountContent Events::Content(int mount_id) {
    const auto [events, size_bytes] =
        connection_
            .FetchOne<std::pair<std::int64_t, std::int64_t>>(
                "select count(*), cast(coalesce(sum(size_bytes), 0) as bigint) from ("
                "select size_bytes from events where mount_id = :plain and recording = 0 and archived = 0 and demo = 0"
                " union all select size_bytes from events where mount_id = :archived and archived = 1 and demo = 0"
                " union all select size_bytes from events where +mount_id = :open and recording = 1 and archived = 0"
                " and demo = 0) as held",
                mount_id, mount_id, mount_id)
            .value();
    return {events, size_bytes};
}

std::map<int, CameraFootage> Events::FootageOfCameras(int camera_id) {
    std::map<int, CameraFootage> footage;
    connection_.Read([&](soci::session& sql) {
        Query<std::tuple<int, std::int64_t, std::int64_t, std::int64_t>>(
            sql, kOnce,
            "select camera_id, count(*), cast(sum(size_bytes) as bigint), min(start_s) from events where demo = 0"
            " and " +
                std::string(camera_id == 0 ? "0" : "camera_id") + " = :camera group by camera_id",
            camera_id)
            .ForEach([&footage](const auto& row) {
                const auto& [camera, events, size_bytes, oldest_s] = row;
                footage[camera] = {events, size_bytes, oldest_s};
            });
    });
    return footage;
}

std::vector<RecentFootage> Events::RecordedSince(std::int64_t from_s) {
    std::vector<RecentFootage> footage;
    for (const int camera : CamerasOn(0)) {
        connection_.Read([&](soci::session& sql) {
            Query<std::tuple<int, std::int64_t, std::int64_t>>(
                sql, kOnce,
                "select mount_id, cast(sum(size_bytes) as bigint), min(start_s) from events where camera_id = :camera"
                " and start_s >= :from and demo = 0 group by mount_id",
                camera, from_s)
                .ForEach([&](const auto& row) {
                    footage.push_back({std::get<0>(row), camera, std::get<1>(row), std::get<2>(row)});
                });
        });
    }
    return footage;
}

// A binary search: later events have higher orders, and the index has no dates.
std::int64_t Events::OrderSince(int mount_id, std::int64_t start_s, std::int64_t low, std::int64_t high) {
    while (low < high) {
        const std::int64_t middle = low + (high - low) / 2;
        const auto next = connection_.FetchOne<std::pair<std::int64_t, std::int64_t>>(
            "select recording_order, start_s from events where mount_id = :mount and recording_order >= :middle"
            " and recording = 0 and archived = 0 and demo = 0 order by recording_order, id limit 1",
            mount_id, middle);
        if (next && next->second < start_s) {
            low = next->first + 1;
        } else {
            high = middle;
        }
    }
    return low;
}

std::vector<std::int64_t> Events::BytesByDay(int mount_id, std::int64_t first_day_s, int days) {
    constexpr std::int64_t kDayS = 86'400;
    const std::int64_t end =
        1 + connection_
                .FetchOne<std::int64_t>("select recording_order from events where mount_id = :mount and recording = 0"
                                        " and archived = 0 and demo = 0 and recording_order < :none"
                                        " order by recording_order desc limit 1",
                                        mount_id, std::numeric_limits<std::int64_t>::max())
                .value_or(-1);
    std::vector<std::int64_t> bytes;
    std::int64_t begin = OrderSince(mount_id, first_day_s, 0, end);
    for (int day = 1; day <= days; ++day) {
        const std::int64_t next = OrderSince(mount_id, first_day_s + day * kDayS, begin, end);
        bytes.push_back(
            connection_
                .FetchOne<std::int64_t>(
                    "select cast(coalesce(sum(size_bytes), 0) as bigint) from events where mount_id = :mount"
                    " and recording_order >= :begin and recording_order < :next and recording = 0"
                    " and archived = 0 and demo = 0",
                    mount_id, begin, next)
                .value());
        begin = next;
    }
    return bytes;
}

std::optional<std::int64_t> Events::OldestOn(int mount_id) {
    const std::vector<Event> first = InRecordingOrder(mount_id, Event(), 1);
    return first.empty() ? std::nullopt : std::optional(first.front().start_s);
}

// In SQLite by steps from camera to camera in the index instead of reading all of it.
std::set<int> Events::CamerasOn(int mount_id) {
    if (!connection_.IsSqlite()) {
        return connection_.FetchAll<int, std::set<int>>(
            "select camera_id from event_cameras where :mount in (0, mount_id)", mount_id);
    }
    const std::string from = mount_id == 0 ? " from events where 0 = " : " from events where mount_id = ";
    return connection_.FetchAll<int, std::set<int>>(
        "with recursive found (camera) as (select min(camera_id)" + from +
            ":first union all select (select min(camera_id)" + from +
            ":next and camera_id > found.camera) from found where found.camera is not null)"
            " select camera from found where camera is not null",
        mount_id, mount_id);
}

}  // namespace lookhaven::store
