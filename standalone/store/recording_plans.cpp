// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/recording_plans.h"

#include <limits>

#include "standalone/store/cameras.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

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

void RequireMount(soci::session& sql, int id) {
    int found = 0;
    sql << "select id from mounts where id = :id", soci::use(id, "id"), soci::into(found);
    if (!sql.got_data()) {
        throw NotFound("there is no mount " + std::to_string(id));
    }
}

// The plans of cameras first to last.
std::map<int, RecordingPlan> Fetch(soci::session& sql, int first, int last) {
    std::map<int, RecordingPlan> plans;
    int camera = 0;
    int mode = 0;
    RecordingPlan plan;
    soci::statement rows = (sql.prepare << "select camera_id, mode, segment, pre_record, post_record, mount_id, profile"
                                           " from recording_plans where camera_id >= :first and camera_id <= :last",
                            soci::use(first, "first"), soci::use(last, "last"), soci::into(camera), soci::into(mode),
                            soci::into(plan.segment_s), soci::into(plan.pre_s), soci::into(plan.post_s),
                            soci::into(plan.mount_id), soci::into(plan.profile));
    rows.execute();
    while (rows.fetch()) {
        plan.mode = static_cast<RecordMode>(mode);
        plans.emplace(camera, plan);
    }
    return plans;
}

}  // namespace

void RecordingPlans::Set(int camera_id, const RecordingPlan& plan) {
    RequirePlan(plan);
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, camera_id);
        if (plan.mount_id != 0) {
            RequireMount(sql, plan.mount_id);
        }
        const int mode = static_cast<int>(plan.mode);
        sql << "insert into recording_plans (camera_id, mode, segment, pre_record, post_record, mount_id, profile)"
               " values (:camera, :mode, :segment, :pre, :post, :mount, :profile)"
               " on conflict (camera_id) do update set mode = excluded.mode, segment = excluded.segment,"
               " pre_record = excluded.pre_record, post_record = excluded.post_record,"
               " mount_id = excluded.mount_id, profile = excluded.profile",
            soci::use(camera_id, "camera"), soci::use(mode, "mode"), soci::use(plan.segment_s, "segment"),
            soci::use(plan.pre_s, "pre"), soci::use(plan.post_s, "post"), soci::use(plan.mount_id, "mount"),
            soci::use(plan.profile, "profile");
    });
}

RecordingPlan RecordingPlans::Find(int camera_id) {
    const auto found = connection_.Read([&](soci::session& sql) { return Fetch(sql, camera_id, camera_id); });
    return found.empty() ? RecordingPlan{} : found.begin()->second;
}

std::map<int, RecordingPlan> RecordingPlans::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, 1, std::numeric_limits<int>::max()); });
}

}  // namespace lookhaven::store
