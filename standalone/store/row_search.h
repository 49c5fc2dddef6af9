// SPDX-License-Identifier: Apache-2.0
//
// How events and marks are searched alike. For this folder's sources.
//
// Why so        PostgreSQL has a partition of either for each month, and a new connection has to read from the
//               catalogue what each of those is that it looks into. So a search reads the few in which its answer
//               most likely lies first, and the others only where it has to.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "standalone/store/connection.h"
#include "standalone/store/events.h"
#include "standalone/store/query.h"

namespace lookhaven::store {

// What starts in [begin_s, end_s).
struct StartSpan {
    std::int64_t begin_s = 0;
    std::int64_t end_s = 0;

    friend bool operator==(const StartSpan&, const StartSpan&) = default;
};

// Splits a search into disjoint spans that cover it, the nearest first: read the next one only while rows are missing.
// On PostgreSQL up to 31 days from where the order begins (from now, if that is nearer), up to 186 days, and the rest.
// One span on SQLite, and for the oldest first from 0 on.
std::vector<StartSpan> NearestFirst(const Connection& connection, StartSpan all, bool newest_first);

// Where what has that id probably starts. On PostgreSQL only.
StartSpan ProbableStarts(soci::session& sql, int id);

// The event or mark of that id that meets the condition ("and …", or ""). Looks where the id was probably given out
// first, then everywhere.
template <typename Row, typename... Parameter>
std::optional<Row> FindById(Connection& connection, int id, const std::string& condition,
                            const Parameter&... parameters) {
    return connection.Read([&](soci::session& sql) {
        if (!connection.IsSqlite()) {
            const StartSpan span = ProbableStarts(sql, id);
            const std::string text = "where id = :id and start_s >= :begin and start_s < :end " + condition;
            if (auto found = FetchOne<Row>(sql, text, id, span.begin_s, span.end_s, parameters...)) {
                return found;
            }
        }
        return FetchOne<Row>(sql, "where id = :id " + condition, id, parameters...);
    });
}

// "start_s, id", or both descending.
std::string OrderOfStarts(bool newest_first);

// The statement of ForEachCamera for PostgreSQL: the rows of each camera of an array.
template <typename Row>
std::string EachCameraText(const std::string& condition, const std::string& order) {
    return std::string("select ") + Mapping<Row>::kColumns +
           " from unnest(cast(:cameras as integer[])) as asked (camera) cross join lateral (select * from " +
           Mapping<Row>::kTable + " where camera_id = asked.camera" + condition + " order by " + order +
           " limit :limit) as found order by camera_id, " + order;
}

// Calls visit(const Row&) for at most limit rows of each camera that start in the span and meet the condition
// (" and …"), in the order of OrderOfStarts, camera by camera. Either engine looks each camera up by itself: that way
// it uses the index (camera, start) for all of it, the order too, however many cameras are asked for. SQLite is asked
// once a camera; PostgreSQL, to which a question is a round trip and a plan, once.
template <typename Row, typename Visit, typename... Parameter>
void ForEachCamera(Connection& connection, soci::session& sql, const std::set<int>& camera_ids, StartSpan starts,
                   bool newest_first, std::int64_t limit, const Visit& visit, const std::string& condition,
                   const Parameter&... parameters) {
    const std::string all = " and start_s >= :begin and start_s < :end" + condition;
    const std::string order = OrderOfStarts(newest_first);
    if (!connection.IsSqlite()) {
        const std::string cameras = ArrayText(camera_ids);
        Query<Row>(sql, kOnce, EachCameraText<Row>(all, order), cameras, starts.begin_s, starts.end_s, parameters...,
                   limit)
            .ForEach(visit);
        return;
    }
    int camera = 0;
    Query<Row> rows(sql, kRepeatedly, "where camera_id = :camera" + all + " order by " + order + " limit :limit",
                    camera, starts.begin_s, starts.end_s, parameters..., limit);
    for (const int id : camera_ids) {
        camera = id;
        rows.ForEach(visit);
    }
}

// The filter's rows without the first filter.offset, at most filter.limit, by start and id. They start in the span; for
// a part of it read(sql, starts, limit, visit) visits at most limit rows of each camera in the order of OrderOfStarts.
template <typename Row, typename Filter, typename ReadPart>
std::vector<Row> ListRows(Connection& connection, const Filter& filter, StartSpan all, const ReadPart& read) {
    const auto offset = static_cast<std::size_t>(std::max(filter.offset, 0));
    const std::size_t wanted = offset + static_cast<std::size_t>(std::max(filter.limit, 0));
    std::vector<Row> rows;
    connection.Read([&](soci::session& sql) {
        for (const StartSpan starts : NearestFirst(connection, all, filter.newest_first)) {
            if (rows.size() >= wanted) {
                break;
            }
            read(sql, starts, static_cast<std::int64_t>(wanted), [&rows](const Row& row) { rows.push_back(row); });
        }
    });
    const auto key = [](const Row& row) { return std::pair(row.start_s, row.id); };
    if (filter.camera_ids.size() > 1) {
        filter.newest_first ? std::ranges::sort(rows, std::greater{}, key) : std::ranges::sort(rows, {}, key);
    }
    rows.resize(std::min(rows.size(), wanted));
    rows.erase(rows.begin(), rows.begin() + static_cast<std::ptrdiff_t>(std::min(rows.size(), offset)));
    return rows;
}

// The starts among which the step's next event or mark lies.
StartSpan StartsOf(const Step& step);

// The nearest row behind the step's place, or before it for one backwards, that meets the condition (" and …").
template <typename Row, typename... Parameter>
std::optional<Row> NextRow(Connection& connection, const Step& step, const std::string& condition,
                           const Parameter&... parameters) {
    // Starts are bound by StartsOf, so this leaves out only rows of the step's own second that are not past its id.
    const std::string behind =
        step.backwards ? " and (start_s < :start or id < :id)" : " and (start_s > :start or id > :id)";
    std::optional<Row> next;
    const auto take = [&](const Row& row) {
        if (!next || step.IsNearer(row, *next)) {
            next = row;
        }
    };
    connection.Read([&](soci::session& sql) {
        for (const StartSpan starts : NearestFirst(connection, StartsOf(step), step.backwards)) {
            if (next) {
                break;
            }
            ForEachCamera<Row>(connection, sql, step.camera_ids, starts, step.backwards, 1, take, behind + condition,
                               step.start_s, step.id, parameters...);
        }
    });
    return next;
}

}  // namespace lookhaven::store
