// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/row_search.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "standalone/base/clock.h"

namespace lookhaven::store {

namespace {

constexpr std::int64_t kDayS = 86'400;
constexpr auto kNoEnd = std::numeric_limits<std::int64_t>::max();

}  // namespace

std::vector<StartSpan> NearestFirst(const Connection& connection, StartSpan all, bool newest_first) {
    // From 0 on, the oldest row may be anywhere: no span is likelier than another.
    if (connection.IsSqlite() || (!newest_first && all.begin_s == 0)) {
        return {all};
    }
    std::vector<StartSpan> spans;
    // A wrong clock only makes it slower.
    const std::int64_t now_s = base::WallSeconds();
    const std::int64_t nearest_s =
        newest_first ? std::clamp<std::int64_t>(all.end_s, 0, now_s) : std::min(all.begin_s, now_s);
    for (const std::int64_t distance_s : {31 * kDayS, 186 * kDayS}) {
        const std::int64_t border_s = newest_first ? nearest_s - distance_s : nearest_s + distance_s;
        if (border_s <= all.begin_s || border_s >= all.end_s) {
            break;
        }
        spans.push_back(newest_first ? StartSpan{border_s, all.end_s} : StartSpan{all.begin_s, border_s});
        (newest_first ? all.end_s : all.begin_s) = border_s;
    }
    spans.push_back(all);
    return spans;
}

// The first id of a month is noted within an hour of its beginning, and recorders reserve ids ahead: hence one day
// more.
StartSpan ProbableStarts(soci::session& sql, int id) {
    const auto [begin_s, end_s] =
        FetchOne<std::pair<std::int64_t, std::int64_t>>(
            sql,
            "select coalesce(max(start_s) filter (where first_id <= :id), 0),"
            " coalesce(min(start_s) filter (where first_id > :same) + 86400, :none) from month_first_ids",
            id, id, kNoEnd)
            .value();
    return {begin_s, end_s};
}

std::string OrderOfStarts(bool newest_first) {
    return newest_first ? "start_s desc, id desc" : "start_s, id";
}

StartSpan StartsOf(const Step& step) {
    return step.backwards ? StartSpan{0, std::min(step.start_s, kNoEnd - 1) + 1} : StartSpan{step.start_s, kNoEnd};
}

}  // namespace lookhaven::store
