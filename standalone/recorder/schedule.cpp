// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/schedule.h"

#include "standalone/base/local_time.h"

namespace lookhaven::recorder {

namespace {

store::HourMode ModeAt(const CameraPlan& plan, std::int64_t time_s) {
    return store::ModeOfHour(plan.mode, plan.hours, base::LocalHourOfWeek(time_s));
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
