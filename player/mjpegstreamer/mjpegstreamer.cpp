// SPDX-License-Identifier: Apache-2.0
//
// Tells the methods of event playback apart.
#include "player/mjpegstreamer/mjpegstreamer.h"

void MjpegStreamHandler::HandleProcess() {
    const std::string method = m_pRequest->GetAPIMethod();
    if (method == "PlayMjpegEvent") {
        HandlePlayEvent();
    } else if (method == "PlayMjpegEventNoFrameId") {
        HandlePlayEventNoFrameId();
    }
}
