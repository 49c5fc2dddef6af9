// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recording_plans.h"

#include "standalone/store/cameras.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

using PlanRow = std::pair<int, RecordingPlan>;

template <>
struct Mapping<PlanRow> {
    static constexpr const char* kTable = "recording_plans";
    static constexpr const char* kColumns = "camera_id, mode, segment, pre_record, post_record, mount_id, profile";
    static auto Members(auto& row) {
        auto& [camera_id, plan] = row;
        return std::tie(camera_id, plan.mode, plan.segment_s, plan.pre_s, plan.post_s, plan.mount_id, plan.profile);
    }
};

namespace {

bool IsWithin(int value, int first, int last) {
    return value >= first && value <= last;
}

void RequirePlan(const RecordingPlan& plan) {
    if (plan.mode != RecordMode::kNever && plan.mode != RecordMode::kAlways) {
        throw InvalidRecord("a camera is recorded always or never");
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
    return connection_.FetchOne<PlanRow>("where camera_id = :camera", camera_id).value_or(PlanRow()).second;
}

std::map<int, RecordingPlan> RecordingPlans::List() {
    return connection_.FetchAll<PlanRow, std::map<int, RecordingPlan>>("");
}

}  // namespace lookhaven::store
