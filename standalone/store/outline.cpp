// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/outline.h"

#include <algorithm>
#include <cstdlib>
#include <tuple>

#include "standalone/store/connection.h"
#include "standalone/store/mark_row.h"

namespace lookhaven::store {

namespace {

void AddBars(soci::session& sql, int camera_id, std::int64_t begin_s, std::int64_t end_s, std::int64_t step_s,
             Outline& outline) {
    JoinedBars continuous(step_s);
    JoinedBars alarm(step_s);
    const std::int64_t earliest_s = std::max(begin_s, base::kMaxRecordingSeconds) - base::kMaxRecordingSeconds;
    Query<std::tuple<std::int64_t, std::int64_t, int>>(
        sql, kOnce,
        "select start_s, end_s, reason from events where camera_id = :camera and start_s >= :earliest"
        " and start_s < :end and end_s > :begin order by start_s",
        camera_id, earliest_s, end_s, begin_s)
        .ForEach([&](const auto& row) {
            const auto& [start_s, stop_s, reason] = row;
            (reason == base::kReasonContinuous ? continuous : alarm).Add({start_s, stop_s});
        });
    outline.continuous = continuous.Take();
    outline.alarm = alarm.Take();
}

void AddMarks(soci::session& sql, int camera_id, std::int64_t begin_s, std::int64_t end_s, std::int64_t step_s,
              Outline& outline) {
    const std::int64_t earliest_s = std::max(begin_s, kMaxFootageSeconds) - kMaxFootageSeconds;
    Query<std::tuple<std::int64_t, MarkKind>>(
        sql, kOnce,
        "select moment_s, kind from marks where camera_id = :camera and start_s >= :earliest and start_s < :end"
        " and end_s > :begin order by start_s",
        camera_id, earliest_s, end_s, begin_s)
        .ForEach([&](const auto& row) {
            const auto& [moment_s, kind] = row;
            std::vector<std::int64_t>& moments = kind == MarkKind::kAlert ? outline.alerts : outline.transactions;
            if (moments.empty() || std::abs(moment_s - moments.back()) >= step_s) {
                moments.push_back(moment_s);
            }
        });
}

}  // namespace

void JoinedBars::Add(const Bar& bar) {
    const bool is_short = IsShort(bar);
    const bool may_join = is_short && !bars_.empty() && (is_joined_ || IsShort(bars_.back()));
    if (may_join && bar.start_s - bars_.back().end_s < step_s_) {
        bars_.back().end_s = std::max(bars_.back().end_s, bar.end_s);
        is_joined_ = true;
        return;
    }
    bars_.push_back(bar);
    is_joined_ = false;
}

Outline OutlineOf(Store& store, int camera_id, std::int64_t begin_s, std::int64_t end_s, std::int64_t step_s) {
    Outline outline;
    store.connection().Read([&](soci::session& sql) {
        outline = {};  // the read may be repeated
        AddBars(sql, camera_id, begin_s, end_s, step_s, outline);
        AddMarks(sql, camera_id, begin_s, end_s, step_s, outline);
    });
    return outline;
}

}  // namespace lookhaven::store
