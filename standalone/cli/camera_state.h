// SPDX-License-Identifier: Apache-2.0
//
// The states of cameras, as the recorder reports them.
#pragma once

#include <map>
#include <optional>
#include <string>

#include <json/json.h>

#include "standalone/base/installation.h"
#include "standalone/maintenance/camera_status.h"

namespace lookhaven::cli {

class CameraStates {
  public:
    // Reads them. Throws std::system_error.
    explicit CameraStates(const base::Installation& installation);

    // Adds the member "state" to a camera that has "id" and "enabled": what the recorder says; "disabled"; "idle",
    // where nobody asks for its picture; "unknown", while no recorder runs. And "no_signal" while no picture comes.
    void AddTo(Json::Value& camera) const;

  private:
    std::optional<std::map<int, maintenance::CameraStatus>> states_;  // by id; nothing while no recorder runs
};

// "no-signal since 2026-03-01 08:15:30 (refused)", from the two members.
std::string CameraStateText(const Json::Value& camera);

}  // namespace lookhaven::cli
