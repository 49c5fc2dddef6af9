// SPDX-License-Identifier: Apache-2.0
//
// A camera's video in its own codec together with its audio: not served yet.
#include "player/liveview_src/liveview_src.h"

void LiveviewSrcHandler::LiveviewMpeg4Cam(int, int) {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
}
