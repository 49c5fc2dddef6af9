// SPDX-License-Identifier: Apache-2.0
//
// What a manager is shown of a camera besides its record: its state, and how much it has recorded.
#pragma once

#include <map>
#include <optional>
#include <set>
#include <vector>

#include <json/json.h>

#include "standalone/api/call.h"
#include "standalone/control/stream_counters.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"

namespace lookhaven::api {

class CameraPage {
  public:
    // Reads all of it. camera_id: whose footage is counted; 0: all cameras'; nothing: none's.
    CameraPage(const Call& call, std::optional<int> camera_id);

    const std::vector<store::Camera>& Cameras() const { return cameras_; }  // in their order

    // Adds to a record of admin::ToJson "order", "state", "reason", "since", "recording", "rate", "bytes", "footage".
    void Complete(Json::Value& record) const;

  private:
    void AddState(Json::Value& record) const;

    std::vector<store::Camera> cameras_;
    bool is_recorder_alive_ = false;
    std::set<int> elsewhere_;  // recorded by another host, whose recorder tells nothing here
    std::map<int, maintenance::CameraStatus> states_;
    std::map<int, std::vector<control::StreamCounters>> streams_;  // by camera
    std::optional<std::map<int, store::CameraFootage>> footage_;
};

}  // namespace lookhaven::api
