// SPDX-License-Identifier: Apache-2.0
//
// Lists the events of a time span: not served yet.
#include "player/multiplayer/multiplayer.h"

void MultiPlayerHandler::HandleEnumEvent() {
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
    Answer(Json::Value());
}
