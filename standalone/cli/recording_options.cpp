// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/recording_options.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <map>

#include "standalone/cli/camera_options.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/units.h"

namespace lookhaven::cli {

namespace {

using store::RecordMode;

const std::map<std::string, RecordMode> kModes = {{"always", RecordMode::kAlways}, {"never", RecordMode::kNever}};

// What is far too long is refused by the store with its rule.
void AssignSeconds(int& target, const std::optional<std::string>& given) {
    if (given) {
        target = static_cast<int>(std::min<std::int64_t>(ParseDuration(*given), std::numeric_limits<int>::max()));
    }
}

}  // namespace

void RecordingOptions::AddTo(CLI::App& command) {
    Choose(command.add_option("--record", mode_, "When it is recorded (never at first)"), kModes);
    command.add_option("--segment", segment_, "Cut recordings into pieces so long, 10s to 60m (5m at first)");
    command.add_option("--pre", pre_, "Footage before an alert or sale, at most 5m (5s at first)");
    command.add_option("--post", post_, "Footage after it (10s at first)");
    command.add_option("--mount", mount_, "Record to this mount; 0 for the default");
    Choose(command.add_option("--record-profile", profile_, "The profile that is recorded (high at first)"),
           ProfileNames());
}

void RecordingOptions::ApplyTo(store::RecordingPlan& plan) const {
    plan.mode = mode_.value_or(plan.mode);
    AssignSeconds(plan.segment_s, segment_);
    AssignSeconds(plan.pre_s, pre_);
    AssignSeconds(plan.post_s, post_);
    plan.mount_id = mount_.value_or(plan.mount_id);
    plan.profile = profile_.value_or(plan.profile);
}

Json::Value PlanData(const store::RecordingPlan& plan) {
    Json::Value data;
    data["mode"] = plan.mode == RecordMode::kAlways ? "always" : "never";
    data["segment"] = plan.segment_s;
    data["pre"] = plan.pre_s;
    data["post"] = plan.post_s;
    data["mount_id"] = plan.mount_id;
    data["profile"] = plan.profile;
    return data;
}

}  // namespace lookhaven::cli
