// SPDX-License-Identifier: Apache-2.0
//
// Cameras as the command line shows them: as JSON, and as a table.
#pragma once

#include <string>

#include <json/json.h>

#include "standalone/store/cameras.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::cli {

Json::Value CameraData(const store::Camera& camera, const store::RecordingPlan& plan);

// The table of an array of these, to each of which CameraStates::AddTo may have added its state.
std::string CameraTable(const Json::Value& cameras);

}  // namespace lookhaven::cli
