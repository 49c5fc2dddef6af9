// SPDX-License-Identifier: Apache-2.0
//
// The partitions of each month, for those who fill a store, and who look for an id. For this folder's sources.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/store/connection.h"

namespace lookhaven::store {

// The months of that many days since the epoch, those after the next month left out. Inside Write on PostgreSQL only.
std::set<std::chrono::year_month> PastMonths(soci::session& sql, const std::set<std::int64_t>& days);

// Makes the month's partitions of both tables where they are not there yet, and moves what the default partitions have
// of it. Inside Write on PostgreSQL only.
void MakePartitions(soci::session& sql, std::chrono::year_month month);

// From the first second up to and not including the other one.
struct Span {
    std::int64_t from_s = 0;
    std::int64_t until_s = 0;
};

// What an answer in the order of starts is read in, one span after the other until it is complete: for PostgreSQL the
// month next to where it begins, in which most answers lie, half a year, and the rest; for SQLite the whole.
std::vector<Span> NearestFirst(const Connection& connection, Span all, bool newest_first);

// Where what has the id most likely starts; nothing where that is not known.
std::optional<Span> LikelySpan(soci::session& sql, int id);

// The event or mark with the id that meets the condition, which begins with "and", "" for none. It is looked for in the
// month in which the id was given first: a request has to read what each partition is before it can look into it.
template <typename Row, typename... Parameter>
std::optional<Row> FindById(Connection& connection, int id, const std::string& condition,
                            const Parameter&... parameters) {
    return connection.Read([&](soci::session& sql) {
        const auto span = connection.IsSqlite() ? std::nullopt : LikelySpan(sql, id);
        std::optional<Row> found;
        if (span) {
            found = FetchOne<Row>(sql, "where id = :id and start_s >= :from and start_s < :until " + condition, id,
                                  span->from_s, span->until_s, parameters...);
        }
        return found ? found : FetchOne<Row>(sql, "where id = :id " + condition, id, parameters...);
    });
}

}  // namespace lookhaven::store
