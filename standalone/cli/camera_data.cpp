// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/camera_data.h"

#include "standalone/cli/camera_options.h"
#include "standalone/cli/camera_state.h"
#include "standalone/cli/json.h"
#include "standalone/cli/recording_options.h"
#include "standalone/cli/retention_text.h"
#include "standalone/cli/table.h"

namespace lookhaven::cli {

namespace {

std::string FeaturesText(const Json::Value& camera) {
    return std::string(camera["ptz"].asBool() ? "PTZ " : "") + (camera["audio"].asBool() ? "audio " : "") +
           (camera["insecure"].asBool() ? "insecure" : "");
}

std::string LiveSourceText(const Json::Value& camera) {
    for (const Json::Value& profile : camera["profiles"]) {
        if (profile["number"] == camera["live_profile"]) {
            return profile["source"].asString();
        }
    }
    return "none";
}

constexpr Column kColumns[] = {{"id", "id"},
                               {"name", "name"},
                               {"state", "", CameraStateText},
                               {"video", "video_type", VideoTypeText},
                               {"features", "", FeaturesText},
                               {"recorded", "recording.mode"},
                               {"max age", "max_age", MaxAgeText},
                               {"live source", "", LiveSourceText}};

}  // namespace

Json::Value CameraData(const store::Camera& camera, const store::RecordingPlan& plan) {
    Json::Value data =
        Object("id", camera.id, "name", camera.name, "enabled", camera.enabled, "video_type",
               static_cast<int>(camera.video_type), "live_profile", camera.live_profile, "ptz", camera.ptz, "audio",
               camera.audio, "insecure", camera.insecure, "recording", PlanData(plan), "max_age", camera.max_age_s);
    if (camera.host_id != 0) {
        data["host"] = camera.host_id;
    }
    for (const store::CameraProfile& profile : camera.profiles) {
        data["profiles"].append(Object("number", profile.number, "source", profile.source, "width", profile.width,
                                       "height", profile.height, "fps", profile.fps));
    }
    return data;
}

std::string CameraTable(const Json::Value& cameras) {
    return Table(kColumns, cameras);
}

}  // namespace lookhaven::cli
