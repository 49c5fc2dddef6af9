// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/recording_options.h"

#include <algorithm>
#include <cstdint>
#include <limits>

#include "standalone/base/local_time.h"
#include "standalone/cli/camera_options.h"
#include "standalone/cli/units.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

// The store refuses what is too long, with the limit in its message.
void AssignSeconds(int& target, const std::optional<std::string>& given) {
    if (given) {
        target = static_cast<int>(std::min<std::int64_t>(ParseDuration(*given), std::numeric_limits<int>::max()));
    }
}

}  // namespace

void RecordingOptions::AddTo(Command& command) {
    command.Option("--record", mode_, "When it is recorded (initially never)", OneOf(store::RecordModeNames()))
        .Option("--segment", segment_, "Length of a recorded event, 10s to 60m (initially 5m)")
        .Option("--pre", pre_, "Footage kept before an alert or POS transaction, at most 5m (initially 5s)")
        .Option("--post", post_, "Footage kept after it (initially 10s)")
        .Option("--mount", mount_, "The mount to record to; 0 for the default mount")
        .Option("--record-profile", profile_, "The profile to record (initially high)", OneOf(store::ProfileNames()));
}

void RecordingOptions::ApplyTo(store::RecordingPlan& plan) const {
    plan.mode = mode_.value_or(plan.mode);
    AssignSeconds(plan.segment_s, segment_);
    AssignSeconds(plan.pre_s, pre_);
    AssignSeconds(plan.post_s, post_);
    plan.mount_id = mount_.value_or(plan.mount_id);
    plan.profile = profile_.value_or(plan.profile);
}

std::string HoursOf(const store::RecordingPlan& plan) {
    return plan.hours.empty() ? std::string(base::kHoursOfWeek, static_cast<char>(store::HourMode::kAroundMarks))
                              : plan.hours;
}

Json::Value PlanData(const store::RecordingPlan& plan) {
    return Object("mode", NameOf(store::RecordModeNames(), plan.mode), "segment", plan.segment_s, "pre", plan.pre_s,
                  "post", plan.post_s, "mount_id", plan.mount_id, "profile", plan.profile, "hours", HoursOf(plan));
}

}  // namespace lookhaven::cli
