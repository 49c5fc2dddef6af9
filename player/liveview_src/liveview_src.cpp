// SPDX-License-Identifier: Apache-2.0
//
// Chooses the output of a live view request, and installs the handlers that set the stop flag.
#include "player/liveview_src/liveview_src.h"

#include <csignal>

#include "platform/camera/camera.h"
#include "player/liveview_src/live_loop.h"

std::atomic<unsigned char> gblStop{0};

namespace {

void OnLiveStopSignal(int) {
    gblStop = 1;
}

}  // namespace

void LiveviewSrcHandler::HandleProcess() {
    if (!Authenticate()) {
        SetErrorCode(LH_WEBAPI_ERR_NO_PERMISSION, "", "");
        return;
    }
    if (m_pRequest->GetAPIMethod() == "Play") {
        HandlePlay();
    }
}

void LiveviewSrcHandler::HandlePlay() {
    const int camera = m_pRequest->GetParam("camera", 0).asInt();
    const int snapshot = m_pRequest->GetParam("snapshot", 0).asInt();
    if (camera <= 0) {
        SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
    } else if (snapshot == 1) {
        SnapshotMjpgCam(camera);
    } else {
        StartLiveview(camera);
    }
}

void LiveviewSrcHandler::StartLiveview(int id) {
    SetupSignalHandler();
    const int itemType = m_pRequest->GetParam("itemType", 0).asInt();
    if (itemType == 1) {
        LiveviewEmap(id);
    }
    if (itemType != 0) {
        return;
    }
    Camera camera;
    const bool isFromPlugin = m_pRequest->GetParam("isFromPlugin", 0).asInt() == 1;
    auto profile = static_cast<CAM_PROFILE_TYPE>(m_pRequest->GetParam("profileType", CAM_PROFILE_DEFAULT).asInt());
    if (camera.Load(id, 0, 0) != 0) {
        LH_LOG(kLiveviewSource, "Failed to load camera [%d].\n", id);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    if (profile == CAM_PROFILE_DEFAULT) {
        profile = camera.GetLiveProfile();
    }
    const int streamNo = camera.GetUiStreamNo(profile);
    LH_TRACE(LOG_CATEG_LIVEVIEW, LOG_LEVEL_NOTICE, kLiveviewSource,
             "Cam[%d]: Start live from profileType[%d] stmId[%d].\n", id, profile, streamNo);
    if (camera.m_VideoType == CAM_VIDEO_MJPEG) {
        LiveviewMjpgCam(id, streamNo, isFromPlugin);
    } else {
        LiveviewMpeg4Cam(id, streamNo);
    }
}

void LiveviewSrcHandler::SetupSignalHandler() {
    struct sigaction action = {};
    action.sa_handler = OnLiveStopSignal;
    if (sigaction(SIGINT, &action, nullptr) != 0) {
        LH_LOG(kLiveviewSource, "Fail to set sigaction [SIGINT].\n");
    }
    if (sigaction(SIGQUIT, &action, nullptr) != 0) {
        LH_LOG(kLiveviewSource, "Fail to set sigaction [SIGQUIT].\n");
    }
    if (sigaction(SIGTERM, &action, nullptr) != 0) {
        LH_LOG(kLiveviewSource, "Fail to set sigaction [SIGTERM].\n");
    }
    if (sigaction(SIGPIPE, &action, nullptr) != 0) {
        LH_LOG(kLiveviewSource, "Fail to set sigaction [SIGPIPE].\n");
    }
}
