// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recording_plans.h"

#include "standalone/base/local_time.h"
#include "standalone/store/cameras.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

using PlanRow = std::pair<int, RecordingPlan>;

template <>
struct Mapping<PlanRow> {
    static constexpr const char* kTable = "recording_plans";
    static constexpr const char* kColumns =
        "camera_id, mode, segment, pre_record, post_record, mount_id, profile, hours";
    static auto Members(auto& row) {
        auto& [camera_id, plan] = row;
        return std::tie(camera_id, plan.mode, plan.segment_s, plan.pre_s, plan.post_s, plan.mount_id, plan.profile,
                        plan.hours);
    }
};

namespace {

bool IsWithin(int value, int first, int last) {
    return value >= first && value <= last;
}

void RequirePlan(const RecordingPlan& plan) {
    if (!IsWithin(static_cast<int>(plan.mode), 0, static_cast<int>(RecordMode::kSchedule))) {
        throw InvalidRecord("a camera is recorded always, never or by a schedule");
    }
    if (!plan.hours.empty() &&
        (plan.hours.size() != base::kHoursOfWeek || plan.hours.find_first_not_of("012") != plan.hours.npos)) {
        throw InvalidRecord("a schedule has 168 hours, each of them 0 (never), 1 (always) or 2 (on alert)");
    }
    if (!IsWithin(plan.segment_s, kMinSegmentSeconds, kMaxSegmentSeconds)) {
        throw InvalidRecord("a recording is cut into pieces of 10 to 3600 seconds");
    }
    if (!IsWithin(plan.pre_s, 0, kMaxAroundMarkSeconds) || !IsWithin(plan.post_s, 0, kMaxAroundMarkSeconds)) {
        throw InvalidRecord("a mark has 0 to 300 seconds of footage before it and after it");
    }
    if (!IsWithin(plan.profile, 0, kProfileCount - 1)) {
        throw InvalidRecord("a camera's profiles have the numbers 0, 1 and 2");
    }
}

}  // namespace

HourMode ModeOfHour(RecordMode mode, const std::string& hours, int hour_of_week) {
    if (mode == RecordMode::kAlways) {
        return HourMode::kAlways;
    }
    if (mode == RecordMode::kNever || hours.empty()) {
        return HourMode::kAroundMarks;
    }
    const auto hour = static_cast<std::size_t>(hour_of_week);
    // With a damaged row it is better to record too much than nothing.
    return hour < hours.size() ? static_cast<HourMode>(hours[hour]) : HourMode::kAlways;
}

HourMode RecordingPlan::At(std::int64_t time_s) const {
    return ModeOfHour(mode, hours, base::LocalHourOfWeek(time_s));
}

void RecordingPlans::Set(int camera_id, const RecordingPlan& plan) {
    RequirePlan(plan);
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, camera_id);
        if (plan.mount_id != 0) {
            Require(FetchOne<int>(sql, "select id from mounts where id = :id", plan.mount_id), "mount", plan.mount_id);
        }
        Execute(sql, "delete from recording_plans where camera_id = :camera", camera_id);
        Insert(sql, PlanRow(camera_id, plan));
    });
}

RecordingPlan RecordingPlans::Find(int camera_id) {
    return connection_.FetchOne<PlanRow>("where camera_id = :camera", camera_id).value_or(PlanRow(0, NoPlan())).second;
}

std::map<int, RecordingPlan> RecordingPlans::List() {
    return connection_.FetchAll<PlanRow, std::map<int, RecordingPlan>>("");
}

}  // namespace lookhaven::store
