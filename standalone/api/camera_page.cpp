// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/camera_page.h"

#include <algorithm>
#include <string>

#include "standalone/api/health.h"
#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/store/hosts.h"

namespace lookhaven::api {

CameraPage::CameraPage(const Call& call, std::optional<int> camera_id)
    : cameras_(store::Cameras(call.Records()).List()) {
    if (camera_id) {
        footage_ = store::Events(call.Records()).FootageOfCameras(*camera_id);
    }
    const base::Installation& installation = call.context.Installation();
    is_recorder_alive_ = control::FindRecorder(installation) == control::RecorderState::kAlive;
    if (const int own_host = installation.HostId(); own_host != 0) {
        store::Hosts hosts(call.Records());
        for (const store::Camera& camera : cameras_) {
            if (const int host = hosts.HostOfCamera(camera.id); host != 0 && host != own_host) {
                elsewhere_.insert(camera.id);
            }
        }
    }
    if (!is_recorder_alive_) {
        return;  // what it told last is stale
    }
    for (maintenance::CameraStatus& status : maintenance::ReadCameraStatus(installation)) {
        states_.emplace(status.camera, std::move(status));
    }
    for (const control::StreamCounters& stream :
         control::ReadStreamCounters(installation).value_or(std::vector<control::StreamCounters>())) {
        streams_[stream.stream.camera].push_back(stream);
    }
}

void CameraPage::Complete(Json::Value& record) const {
    const int id = record["id"].asInt();
    const auto place = std::ranges::find(cameras_, id, &store::Camera::id);
    record["order"] = static_cast<int>(place - cameras_.begin()) + 1;
    AddState(record);
    record["footage"] = Json::nullValue;
    if (footage_) {
        const auto found = footage_->find(id);
        const store::CameraFootage footage = found == footage_->end() ? store::CameraFootage() : found->second;
        record["footage"]["events"] = Json::Int64{footage.events};
        record["footage"]["bytes"] = Json::Int64{footage.size_bytes};
        record["footage"]["oldest"] = footage.events > 0 ? Json::Value(Json::Int64{footage.oldest_s}) : Json::Value();
    }
}

void CameraPage::AddState(Json::Value& record) const {
    const int id = record["id"].asInt();
    double rate = 0;
    double bytes = 0;
    bool has_picture = false;
    const auto streams = streams_.find(id);
    for (const control::StreamCounters& stream :
         streams == streams_.end() ? std::vector<control::StreamCounters>() : streams->second) {
        rate = std::max(rate, stream.pictures_per_second);
        bytes += stream.bytes_per_second;
        has_picture |= stream.pictures > 0 && base::MonotonicMicros() - stream.last_picture_us < kMaxPictureAgeUs;
    }
    const auto status = states_.find(id);
    const bool is_lost = status != states_.end() && status->second.lost_since_s > 0;
    record["state"] = !record["enabled"].asBool()                      ? "disabled"
                      : !is_recorder_alive_ || elsewhere_.contains(id) ? "unknown"
                      : is_lost                                        ? "no-signal"
                      : has_picture                                    ? "running"
                      : streams != streams_.end()                      ? "connecting"
                                                                       : "idle";
    record["reason"] = is_lost ? std::string(base::NameOf(status->second.loss)) : "";
    record["since"] = is_lost ? Json::Value(Json::Int64{status->second.lost_since_s}) : Json::Value();
    record["recording"] = status == states_.end() ? "" : maintenance::NameOf(status->second.state);
    record["rate"] = has_picture ? rate : 0;
    record["bytes"] = Json::Int64(has_picture ? bytes : 0);
}

}  // namespace lookhaven::api
