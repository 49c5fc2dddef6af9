// SPDX-License-Identifier: Apache-2.0
//
// Tells the methods of event search apart.
#include "player/multiplayer/multiplayer.h"

void MultiPlayerHandler::HandleProcess() {
    const std::string method = m_pRequest->GetAPIMethod();
    if (method == "EnumEvent") {
        HandleEnumEvent();
    } else if (method == "SearchAvaiDate") {
        HandleSearchAvaiDate();
    }
}
