// SPDX-License-Identifier: Apache-2.0
//
// Questions about events; events.cpp changes them.
#include <algorithm>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/event_row.h"
#include "standalone/store/events.h"

namespace lookhaven::store {

namespace {

constexpr int kRowsAtOnce = 10'000;

template <typename Visitor, typename... Use>
void ForEach(soci::session& sql, const std::string& query, Visitor&& visit, const Use&... use) {
    EventRow row;
    soci::statement rows(sql);
    row.BindTo(rows);
    (rows.exchange(use), ...);
    rows.alloc();
    rows.prepare(query);
    rows.define_and_bind();
    rows.execute();
    while (rows.fetch()) {
        visit(row.Read());
    }
}

template <typename... Use>
std::vector<Event> Collect(soci::session& sql, const std::string& query, const Use&... use) {
    std::vector<Event> events;
    ForEach(
        sql, query, [&](const Event& event) { events.push_back(event); }, use...);
    return events;
}

// The filter's rows of each of its cameras, one query a camera: that way both engines use the index (camera, start)
// for all of it, the order too, however many cameras are asked for.
void Search(soci::session& sql, const EventFilter& filter, Number limit, const Events::Visitor& visit) {
    const Number begin = filter.begin_s;
    const Number end = filter.end_s;
    // Nothing starts before this and still reaches the span.
    const Number earliest = std::max<Number>(begin, base::kMaxRecordingSeconds) - base::kMaxRecordingSeconds;
    const int finished_only = filter.finished_only;
    int camera = 0;
    EventRow row;
    soci::statement rows(sql);
    row.BindTo(rows);
    rows.exchange(soci::use(camera, "camera"));
    rows.exchange(soci::use(earliest, "earliest"));
    rows.exchange(soci::use(end, "end"));
    rows.exchange(soci::use(begin, "begin"));
    rows.exchange(soci::use(filter.mount_id, "mount"));
    rows.exchange(soci::use(filter.reason, "reason"));
    rows.exchange(soci::use(finished_only, "finished"));
    rows.exchange(soci::use(limit, "limit"));
    rows.alloc();
    rows.prepare(std::string(EventRow::kSelect) +
                 " where camera_id = :camera and start_s >= :earliest and start_s < :end and end_s > :begin"
                 " and (:mount = 0 or mount_id = :mount) and (:reason = 0 or reason = :reason)"
                 " and (:finished = 0 or recording = 0) order by " +
                 (filter.newest_first ? "start_s desc, id desc" : "start_s, id") + " limit :limit");
    rows.define_and_bind();
    for (const int id : filter.camera_ids) {
        camera = id;
        rows.execute();
        while (rows.fetch()) {
            visit(row.Read());
        }
    }
}

}  // namespace

std::optional<Event> Events::Find(int id) {
    std::vector<Event> found = connection_.Read([&](soci::session& sql) {
        return Collect(sql, std::string(EventRow::kSelect) + " where id = :id", soci::use(id, "id"));
    });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<Event> Events::List(const EventFilter& filter) {
    const auto offset = static_cast<std::size_t>(std::max(filter.offset, 0));
    const auto limit = static_cast<std::size_t>(std::max(filter.limit, 0));
    std::vector<Event> events;
    connection_.Read([&](soci::session& sql) {
        Search(sql, filter, static_cast<Number>(offset + limit), [&](const Event& event) { events.push_back(event); });
    });
    const auto key = [](const Event& event) { return std::pair(event.start_s, event.id); };
    if (filter.camera_ids.size() > 1) {
        filter.newest_first ? std::ranges::sort(events, std::greater{}, key) : std::ranges::sort(events, {}, key);
    }
    events.resize(std::min(events.size(), offset + limit));
    events.erase(events.begin(), events.begin() + static_cast<std::ptrdiff_t>(std::min(events.size(), offset)));
    return events;
}

void Events::Visit(const EventFilter& filter, const Visitor& visitor) {
    connection_.Read([&](soci::session& sql) { Search(sql, filter, std::numeric_limits<Number>::max(), visitor); });
}

std::vector<Event> Events::Open() {
    return connection_.Read([](soci::session& sql) {
        return Collect(sql, std::string(EventRow::kSelect) + " where recording = 1 order by id");
    });
}

std::vector<Event> Events::Oldest(int mount_id, int limit) {
    return connection_.Read([&](soci::session& sql) {
        return Collect(sql,
                       std::string(EventRow::kSelect) + " where mount_id = :mount and recording = 0 and archived = 0"
                                                        " and demo = 0 order by start_s limit :limit",
                       soci::use(mount_id, "mount"), soci::use(limit, "limit"));
    });
}

void Events::VisitMount(int mount_id, const Visitor& visitor) {
    for (const int camera : CamerasOn(mount_id)) {
        int after = 0;
        std::vector<Event> page;
        do {
            page = connection_.Read([&](soci::session& sql) {
                return Collect(sql,
                               std::string(EventRow::kSelect) + " where mount_id = :mount and camera_id = :camera"
                                                                " and id > :after order by id limit :limit",
                               soci::use(mount_id, "mount"), soci::use(camera, "camera"), soci::use(after, "after"),
                               soci::use(kRowsAtOnce, "limit"));
            });
            for (const Event& event : page) {
                after = event.id;
                if (!event.demo) {
                    visitor(event);
                }
            }
        } while (!page.empty());
    }
}

MountContent Events::Content(int mount_id) {
    return connection_.Read([&](soci::session& sql) {
        Number events = 0;
        Number size = 0;
        // Three parts, each of which has an index of its own; the sign keeps the third from taking another.
        sql << "select count(*), cast(coalesce(sum(size_bytes), 0) as bigint) from ("
               "select size_bytes from events where mount_id = :mount and recording = 0 and archived = 0 and demo = 0"
               " union all select size_bytes from events where mount_id = :mount and archived = 1 and demo = 0"
               " union all select size_bytes from events where +mount_id = :mount and recording = 1 and archived = 0"
               " and demo = 0) as held",
            soci::use(mount_id, "mount"), soci::into(events), soci::into(size);
        return MountContent{events, size};
    });
}

// Steps from camera to camera in the index instead of reading all of it.
std::set<int> Events::CamerasOn(int mount_id) {
    return connection_.Read([&](soci::session& sql) {
        const std::string from =
            mount_id == 0 ? " from events where :mount = 0" : " from events where mount_id = :mount";
        std::set<int> cameras;
        int camera = 0;
        soci::statement rows =
            (sql.prepare << "with recursive found (camera) as (select min(camera_id)" + from +
                                " union all select (select min(camera_id)" + from +
                                " and camera_id > found.camera) from found where found.camera is not null)"
                                " select camera from found where camera is not null",
             soci::use(mount_id, "mount"), soci::into(camera));
        rows.execute();
        while (rows.fetch()) {
            cameras.insert(camera);
        }
        return cameras;
    });
}

}  // namespace lookhaven::store
