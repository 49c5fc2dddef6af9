// SPDX-License-Identifier: Apache-2.0
//
// Dispatches the methods of event playback.
#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"

void MjpegStreamHandler::HandleProcess() {
    g_PlayerSessionId = m_pRequest->GetSessionID();
    const std::string method = m_pRequest->GetAPIMethod();
    if (method == "PlayMjpegEvent") {
        HandlePlayEvent();
    } else if (method == "PlayMjpegEventNoFrameId") {
        HandlePlayEventNoFrameId();
    }
}
