// SPDX-License-Identifier: Apache-2.0
//
// The options that describe how a camera is recorded, and how they change its plan.
#pragma once

#include <optional>
#include <string>

#include <json/json.h>

#include "standalone/cli/command_group.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::cli {

// What was given on the command line; what was not stays as it is.
class RecordingOptions {
  public:
    // This object must outlive the command.
    void AddTo(Command& command);

    bool IsGiven() const { return mode_ || segment_ || pre_ || post_ || mount_ || profile_; }
    // Throws Failure for a duration of another form.
    void ApplyTo(store::RecordingPlan& plan) const;

  private:
    std::optional<store::RecordMode> mode_;
    std::optional<std::string> segment_;
    std::optional<std::string> pre_;
    std::optional<std::string> post_;
    std::optional<int> mount_;
    std::optional<int> profile_;
};

// The hours of a schedule, all of them.
std::string HoursOf(const store::RecordingPlan& plan);

Json::Value PlanData(const store::RecordingPlan& plan);

}  // namespace lookhaven::cli
