// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/camera_state.h"

#include <utility>

#include "standalone/cli/console.h"
#include "standalone/cli/units.h"
#include "standalone/control/common_config.h"

namespace lookhaven::cli {

CameraStates::CameraStates(const base::Installation& installation) {
    if (control::FindRecorder(installation) != control::RecorderState::kAlive) {
        return;  // what it told last is stale
    }
    states_.emplace();
    for (maintenance::CameraStatus& status : maintenance::ReadCameraStatus(installation)) {
        states_->emplace(status.camera, std::move(status));
    }
}

void CameraStates::AddTo(Json::Value& camera) const {
    const int id = camera["id"].asInt();
    if (!camera["enabled"].asBool() || !states_ || !states_->contains(id)) {
        camera["state"] = !camera["enabled"].asBool() ? "disabled" : states_ ? "idle" : "unknown";
        return;
    }
    const maintenance::CameraStatus& status = states_->at(id);
    camera["state"] = maintenance::NameOf(status.state);
    if (status.lost_since_s > 0) {
        camera["no_signal"] = Object("since", status.lost_since_s, "cause", std::string(base::NameOf(status.loss)),
                                     "reason", status.loss_reason);
    }
}

std::string CameraStateText(const Json::Value& camera) {
    const Json::Value& loss = camera["no_signal"];
    const std::string state = camera["state"].asString();
    return loss.isNull() ? state
                         : Concat(state, state == "no-signal" ? "" : ", no-signal", " since ",
                                  FormatMoment(loss["since"].asInt64()), " (", loss["cause"].asString(), ")");
}

}  // namespace lookhaven::cli
