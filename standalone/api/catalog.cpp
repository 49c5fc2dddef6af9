// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Catalog: the camera groups, mounts and e-maps that the caller may see, how the cameras are, and what the caller
// may do with each.
#include "standalone/api/own_apis.h"

#include <algorithm>
#include <map>
#include <set>

#include "platform/camera/camgroup.h"
#include "platform/privilege/privprofile.h"
#include "standalone/api/named_list.h"
#include "standalone/binding/rights.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/store/cameras.h"
#include "standalone/store/emaps.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "standalone/store/servers.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

template <typename Records>
Json::Value IdsOf(const Records& cameras) {
    Json::Value ids(Json::arrayValue);
    for (const auto& [id, camera] : cameras) {
        ids.append(id);
    }
    return ids;
}

std::string Groups(const Call& call) {
    const std::set<int> denied = PrivProfileGetByUid(call.context.Caller()).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK);
    const std::set<int> unwatchable = binding::DeniedCameras(store::CameraAccess::kLive);
    Json::Value data;
    Json::Value& list = data["group"] = Json::arrayValue;
    for (const store::CameraGroup& group : store::Groups(call.Records()).List()) {
        CamGroup cameras;
        const bool is_playable = !denied.contains(group.id) && cameras.Load(group.id) == 0;
        Json::Value live = Json::arrayValue;
        for (const int id : group.camera_ids) {
            if (!unwatchable.contains(id)) {
                live.append(id);
            }
        }
        if (is_playable || !live.empty()) {
            Json::Value& json = AppendNamed(list, group);
            json["camera"] = is_playable ? IdsOf(cameras.GetCamMap()) : Json::Value(Json::arrayValue);
            json["live"] = std::move(live);
        }
    }
    return SuccessAnswer(data);
}

// A viewer is not shown a mount without a camera that they may see.
std::string Mounts(const Call& call) {
    const bool is_manager = binding::IsManager();
    Json::Value data;
    Json::Value& list = data["mount"] = Json::arrayValue;
    for (const store::Mount& mount : store::Mounts(call.Records()).List()) {
        Json::Value cameras = IdsOf(GetCamMountMap(mount.id, "", true));
        if (is_manager || !cameras.empty()) {
            Json::Value& json = AppendNamed(list, mount);
            json["is_default"] = mount.is_default;
            json["enabled"] = mount.enabled;
            json["camera"] = std::move(cameras);
        }
    }
    return SuccessAnswer(data);
}

// The number of items is told to managers alone, for it counts those that a viewer is not shown.
std::string Emaps(const Call& call) {
    const bool is_manager = binding::IsManager();
    Json::Value data;
    Json::Value& list = data["emap"] = Json::arrayValue;
    for (const store::EmapSummary& emap : store::Emaps(call.Records()).List()) {
        if (binding::MaySee(store::DeniableItem::kEmap, emap.id)) {
            Json::Value& json = AppendNamed(list, emap);
            if (is_manager) {
                json["item_num"] = emap.item_count;
            }
        }
    }
    return SuccessAnswer(data);
}

// The sentence may name addresses of the cameras' network, which are a manager's to know.
Json::Value NoSignal(const maintenance::CameraStatus& status, bool is_manager) {
    Json::Value json;
    json["since"] = status.lost_since_s;
    json["cause"] = std::string(base::NameOf(status.loss));
    if (is_manager) {
        json["reason"] = status.loss_reason;
    }
    return json;
}

// The states of those cameras that the caller may watch and that are recorded or watched now.
std::string CameraStates(const Call& call) {
    const bool is_manager = binding::IsManager();
    const base::Installation& installation = call.context.Installation();
    const bool is_known = control::FindRecorder(installation) == control::RecorderState::kAlive;
    Json::Value data;
    data["recorder"] = is_known;
    Json::Value& list = data["camera"] = Json::arrayValue;
    for (const maintenance::CameraStatus& status :
         is_known ? maintenance::ReadCameraStatus(installation) : std::vector<maintenance::CameraStatus>()) {
        if (!binding::MayUse(status.camera, store::CameraAccess::kLive)) {
            continue;
        }
        Json::Value& json = list.append(Json::objectValue);
        json["id"] = status.camera;
        json["state"] = maintenance::NameOf(status.state);
        if (status.lost_since_s > 0) {
            json["no_signal"] = NoSignal(status, is_manager);
        }
    }
    return SuccessAnswer(data);
}

// The caller's rights at the cameras that they may watch or play back, those of paired hosts included.
std::string Rights(const Call& call) {
    using store::CameraAccess;
    std::map<CameraAccess, std::set<int>> denied;
    for (const CameraAccess kind : store::kEveryAccess) {
        denied[kind] = binding::DeniedCameras(kind);
    }
    Json::Value data;
    Json::Value& list = data["camera"] = Json::arrayValue;
    const auto add = [&](const auto& camera) {
        const auto may = [&](CameraAccess kind) { return !denied[kind].contains(camera.id); };
        if (may(CameraAccess::kLive) || may(CameraAccess::kPlayback)) {
            Json::Value& json = list.append(Json::objectValue);
            json["id"] = camera.id;
            for (const auto& [name, kind] : store::CameraAccessNames()) {
                json[name] = may(kind);
            }
        }
    };
    std::ranges::for_each(store::Cameras(call.Records()).List(), add);
    std::ranges::for_each(store::RecordingServers(call.Records()).ListCameras(), add);
    return SuccessAnswer(data);
}

constexpr Method kMethods[] = {
    {"CameraStates", CameraStates}, {"Groups", Groups}, {"Mounts", Mounts}, {"Emaps", Emaps}, {"Rights", Rights}};

}  // namespace

const OwnApi kCatalogApi{"VEXO.Catalog", kMethods};

}  // namespace lookhaven::api
