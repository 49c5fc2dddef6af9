// SPDX-License-Identifier: Apache-2.0
//
// Dispatches the methods of event search.
#include "player/multiplayer/multiplayer.h"

void MultiPlayerHandler::HandleProcess() {
    const std::string method = m_pRequest->GetAPIMethod();
    LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_INFO, kMultiPlayerSource, "Method [%s], Params [%s]\n", method.c_str(),
             m_pRequest->GetParam("", Json::Value()).toStyledString().c_str());
    if (method == "EnumEvent") {
        HandleEnumEvent();
    } else if (method == "SearchAvaiDate") {
        HandleSearchAvaiDate();
    }
}
