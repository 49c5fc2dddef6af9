// SPDX-License-Identifier: Apache-2.0
//
// Marks by the words in their texts, by either engine's own full text search.
//
// Why so        In SQLite's index the row of a mark is its start and, in the lower 32 bits, its id: so the index itself
//               gives the newest first, and a span of time is a part of it. Cameras and kinds are words there, too
//               ("c5", "k1"), so that those of other cameras are not even looked at. PostgreSQL's index holds the
//               camera as an array of one (it has no other index of words and numbers without an extension); the
//               planner chooses between it and a walk along the time, and looks the cameras up again as numbers, of
//               which it knows how many there are. On the walk a text is split into words only where it has the
//               letters of them all, which takes a quarter of the time to see.
// See           mark_words_schema.h, which keeps both in step with the marks.
#include <algorithm>
#include <iterator>
#include <sstream>
#include <string>

#include "standalone/store/connection.h"
#include "standalone/store/mark_row.h"

namespace lookhaven::store {

namespace {

constexpr std::int64_t kIdMask = 0xFFFF'FFFF;
constexpr int kMaxReadOffset = 1'000;  // beyond it PostgreSQL skips the rows, in one query over all spans

// What is quoted is words and has no other meaning; a phrase holds no quotes.
std::string ExpressionOf(const MarkFilter& filter) {
    std::string cameras;
    for (const int camera : filter.camera_ids) {
        cameras += (cameras.empty() ? "\"c" : " OR \"c") + std::to_string(camera) + '"';
    }
    std::string expression = "tags : (" + cameras + ")";
    if (filter.kind) {
        expression += " AND tags : \"k" + std::to_string(static_cast<int>(*filter.kind)) + '"';
    }
    for (const TextQuery::Phrase& phrase : filter.words.Phrases()) {
        expression += " AND words : \"" + phrase.typed + '"';
    }
    return expression;
}

// Seconds as an index of SQLite has them.
std::int64_t WithinIndex(std::int64_t time_s) {
    return std::clamp<std::int64_t>(time_s, 0, kLastMoment);
}

std::vector<Mark> OnSqlite(soci::session& sql, const MarkFilter& filter, std::int64_t earliest_s) {
    if (filter.end_s <= 0) {
        return {};
    }
    const std::string expression = ExpressionOf(filter);
    const std::int64_t first = WithinIndex(earliest_s) << 32;
    const std::int64_t last = WithinIndex(filter.end_s - 1) << 32 | kIdMask;
    return FetchAll<Mark>(sql,
                          std::string("select ") + Mapping<Mark>::kColumns +
                              " from mark_words cross join marks on marks.id = (mark_words.rowid & :mask)"
                              " where mark_words match :expression and mark_words.rowid >= :first"
                              " and mark_words.rowid <= :last and end_s > :begin" +
                              " order by mark_words.rowid" + (filter.newest_first ? " desc" : "") +
                              " limit :limit offset :offset",
                          kIdMask, expression, first, last, filter.begin_s, filter.limit, filter.offset);
}

// A pattern for LIKE per word, with spaces between: a text that has the words matches all of them, and only such a text
// need be split into words. None for words beyond ASCII: whether splitting leaves them as they are depends on the
// server.
std::string LikePatternsOf(const TextQuery& words) {
    std::string patterns;
    for (const TextQuery::Phrase& phrase : words.Phrases()) {
        if (std::ranges::any_of(phrase.typed, [](char c) { return static_cast<unsigned char>(c) >= 0x80; })) {
            continue;
        }
        std::istringstream typed(phrase.typed);
        for (std::string word; typed >> word;) {
            patterns += (patterns.empty() ? "%" : " %") + word + '%';
        }
    }
    return patterns;
}

// Those that start then.
std::vector<Mark> OnPostgresql(soci::session& sql, const MarkFilter& filter, StartSpan starts, std::int64_t limit,
                               std::int64_t offset) {
    const std::string cameras = ArrayText(filter.camera_ids);
    std::string words;
    for (const TextQuery::Phrase& phrase : filter.words.Phrases()) {
        words += (words.empty() ? "'" : " & '") + phrase.typed + '\'';
    }
    const std::string patterns = LikePatternsOf(filter.words);
    // Without the cast to a number, the planner would assume that few rows match the patterns.
    return FetchAll<Mark>(
        sql,
        "where mark_words(text) @@ to_tsquery('simple', mark_small(:words))"
        " and cast(mark_small(text) like all (string_to_array(mark_small(:patterns), ' ')) as integer)"
        " <> 0 and array[camera_id] && cast(:cameras as integer[])"
        " and camera_id = any (cast(:same_cameras as integer[])) and start_s >= :from"
        " and start_s < :until and end_s > :begin and :kind in (0, kind) order by " +
            OrderOfStarts(filter.newest_first) + " limit :limit offset :offset",
        words, patterns, cameras, cameras, starts.begin_s, starts.end_s, filter.begin_s, NumberOf(filter.kind), limit,
        offset);
}

}  // namespace

std::vector<Mark> FindMarksByWords(Connection& connection, const MarkFilter& filter) {
    if (filter.camera_ids.empty() || filter.limit <= 0) {
        return {};
    }
    return connection.Read([&](soci::session& sql) {
        if (connection.IsSqlite()) {
            return OnSqlite(sql, filter, StartsOf(filter).begin_s);
        }
        if (filter.offset > kMaxReadOffset) {
            return OnPostgresql(sql, filter, StartsOf(filter), filter.limit, filter.offset);
        }
        const std::int64_t offset = std::max(filter.offset, 0);
        const std::int64_t wanted = filter.limit + offset;
        std::vector<Mark> found;
        for (const StartSpan starts : NearestFirst(connection, StartsOf(filter), filter.newest_first)) {
            if (std::ssize(found) == wanted) {
                break;
            }
            std::ranges::move(OnPostgresql(sql, filter, starts, wanted - std::ssize(found), 0),
                              std::back_inserter(found));
        }
        found.erase(found.begin(),
                    found.begin() + static_cast<std::ptrdiff_t>(std::min<std::int64_t>(offset, std::ssize(found))));
        return found;
    });
}

}  // namespace lookhaven::store
