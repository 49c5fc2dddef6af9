// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/schedule.h"

#include "standalone/base/local_time.h"

namespace lookhaven::recorder {

namespace {

// 1 January 2024: no clock that is right shows less, and which hour it is nobody knows then.
constexpr std::int64_t kEarliestS = 1'704'067'200;

store::HourMode ModeAt(const CameraPlan& plan, std::int64_t time_s) {
    if (plan.mode != store::RecordMode::kSchedule) {
        return store::ModeOfHour(plan.mode, plan.hours, 0);
    }
    return time_s < kEarliestS ? store::HourMode::kAlways
                               : store::ModeOfHour(plan.mode, plan.hours, base::LocalHourOfWeek(time_s));
}

}  // namespace

CameraPlan PlanAt(const CameraPlan& plan, std::int64_t now_s) {
    CameraPlan now = plan;
    if (plan.mode == store::RecordMode::kSchedule) {
        const store::HourMode mode = ModeAt(plan, now_s);
        now.mode = mode == store::HourMode::kAlways ? store::RecordMode::kAlways : store::RecordMode::kNever;
        if (mode == store::HourMode::kNever && !TakesMarkAt(plan, now_s + plan.pre_s)) {
            now.pre_s = 0;
        }
    }
    return now;
}

bool TakesMarkAt(const CameraPlan& plan, std::int64_t moment_s) {
    return ModeAt(plan, moment_s) != store::HourMode::kNever;
}

}  // namespace lookhaven::recorder
