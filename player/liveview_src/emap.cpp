// SPDX-License-Identifier: Apache-2.0
//
// The description of an e-map: not served yet.
#include "player/liveview_src/liveview_src.h"

void LiveviewSrcHandler::LiveviewEmap(int) {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
}
