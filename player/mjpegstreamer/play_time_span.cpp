// SPDX-License-Identifier: Apache-2.0
//
// Plays an event between two times: not served yet.
#include "player/mjpegstreamer/mjpegstreamer.h"

void MjpegStreamHandler::HandlePlayEventNoFrameId() {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
    Answer(Json::Value());
}
