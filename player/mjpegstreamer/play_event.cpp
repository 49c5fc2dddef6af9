// SPDX-License-Identifier: Apache-2.0
//
// Plays an event by frame numbers: not served yet.
#include "player/mjpegstreamer/mjpegstreamer.h"

void MjpegStreamHandler::HandlePlayEvent() {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
    Answer(Json::Value());
}
