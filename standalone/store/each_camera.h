// SPDX-License-Identifier: Apache-2.0
//
// Rows of several cameras, of events or of marks. For this folder's sources.
#pragma once

#include <set>
#include <string>

#include "standalone/store/connection.h"

namespace lookhaven::store {

// For PostgreSQL: the rows of each camera of an array that meet the condition.
template <typename Row>
std::string EachCameraText(const std::string& condition, const std::string& order) {
    return std::string("select ") + Mapping<Row>::kColumns +
           " from unnest(cast(:cameras as integer[])) as asked (camera) cross join lateral"
           " (select * from " +
           Mapping<Row>::kTable + " where camera_id = asked.camera" + condition + ") as found order by camera_id, " +
           order;
}

// Calls visit(const Row&) for the rows that meet the condition, which begins with "and" and ends in the order, camera by
// camera. Either engine looks each camera up by itself: that way it uses the index (camera, start) for all of it, the
// order too, however many cameras are asked for. SQLite is asked once a camera; PostgreSQL, to which a question is a
// message, a plan and an answer, once.
template <typename Row, typename Visit, typename... Parameter>
void ForEachCamera(Connection& connection, soci::session& sql, const std::set<int>& camera_ids,
                   const std::string& condition, const std::string& order, const Visit& visit,
                   const Parameter&... parameters) {
    if (!connection.IsSqlite()) {
        const std::string cameras = ArrayText(camera_ids);
        Query<Row>(sql, kOnce, EachCameraText<Row>(condition, order), cameras, parameters...).ForEach(visit);
        return;
    }
    int camera = 0;
    Query<Row> rows(sql, kRepeatedly, "where camera_id = :camera" + condition, camera, parameters...);
    for (const int id : camera_ids) {
        camera = id;
        rows.ForEach(visit);
    }
}

}  // namespace lookhaven::store
