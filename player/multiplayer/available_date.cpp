// SPDX-License-Identifier: Apache-2.0
//
// Tells the days on which recordings exist: not served yet.
#include "player/multiplayer/multiplayer.h"

void MultiPlayerHandler::HandleSearchAvaiDate() {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
    Answer(Json::Value());
}
