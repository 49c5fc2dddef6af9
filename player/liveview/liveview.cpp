// SPDX-License-Identifier: Apache-2.0
//
// The list of cameras that a client may watch, with what it needs to open each of them.
#include "player/liveview/liveview.h"

#include <list>

#include "platform/camera/camera.h"
#include "platform/camera/devcap.h"
#include "player/iter2string.h"

namespace {

constexpr char kSource[] = "liveview";

// A name that lives as long as the program is not copied into each of many objects.
using Key = Json::StaticString;

Json::Value DescribeCamera(const Camera& camera, int loginPort, const DevCapHandler& devCap,
                           const std::string& userName) {
    Json::Value description;
    description[Key("id")] = camera.m_Id;
    description[Key("name")] = camera.m_szName;
    description[Key("video_type")] = camera.m_VideoType;
    description[Key("liveview_port")] = loginPort;
    description[Key("cam_ptz")] = CamCapUtils::GetLiveStmPtzCapByUserName(devCap, camera, userName);
    description[Key("sound_support")] = devCap.m_SoundSupport() != 0 ? 1 : 0;
    return description;
}

}  // namespace

void LiveviewHandler::HandleProcess() {
    if (m_pRequest->GetAPIMethod() == "LoadCamera") {
        HandleLiveviewLoad();
    }
}

int LiveviewHandler::HandleLiveviewLoad() {
    const int camId = m_pRequest->GetParam("camera", 0).asInt();
    const int result = SendCamerasData(camId, GetPrivUid(), camId < 1);
    if (result != 0) {
        LH_LOG_AT(kSource, 96, __func__, "Failed to sent camera data.\n");
    }
    return result;
}

int LiveviewHandler::SendCamerasData(int camId, unsigned int uid, bool showAll) {
    const PrivProfile profile = PrivProfileGetByUid(uid);
    if (profile.GetId() == 0) {
        LH_LOG_AT(kSource, 24, __func__, "Incorrect priv profile of Uid[%u].\n", uid);
        return -1;
    }
    const std::set<int> denied = profile.GetInaCamIdSet(CAM_PRIV_LIVEVIEW, false);
    const std::list<Camera> cameras =
        GetCamLocalList(false, "", Iter2String(denied.begin(), denied.end(), ","), false, false);
    const bool isManager = profile.GetPrivilege() == 0 || profile.GetPrivilege() == 1;
    const int loginPort = GetLoginPort();
    if (loginPort <= 0) {
        LH_LOG_AT(kSource, 36, __func__, "Failed to get direct login port.\n");
        return -1;
    }

    Json::Value answer;
    Json::UInt enabledCount = 0;
    int firstId = -1;
    for (const Camera& camera : cameras) {
        if (!camera.m_blEnabled) {
            continue;
        }
        ++enabledCount;
        if (firstId == -1 && camera.m_VideoType == CAM_VIDEO_MJPEG) {
            firstId = camera.m_Id;
        }
        DevCapHandler devCap;
        if (devCap.LoadByCam(camera) != 0) {
            LH_LOG_AT(kSource, 57, __func__, "Failed to get camera cap.\n");
            return -1;
        }
        answer["camera"].append(DescribeCamera(camera, loginPort, devCap, m_pRequest->GetLoginUserName()));
    }
    answer["selected"] = camId != 0 ? camId : firstId;
    answer["isManager"] = isManager;
    answer["ShowAll"] = showAll ? 1 : 0;
    answer["CamNum"] = static_cast<Json::UInt>(cameras.size());
    answer["EnableCamNum"] = enabledCount;
    m_pResponse->SetSuccess(answer);
    return 0;
}
