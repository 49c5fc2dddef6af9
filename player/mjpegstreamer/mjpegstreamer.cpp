// SPDX-License-Identifier: Apache-2.0
//
// Makes the process the player of its session, and shows a warning where it cannot.
#include "player/mjpegstreamer/mjpegstreamer.h"

#include <cstdio>

#include "player/mjpegstreamer/player_session.h"

bool MjpegStreamHandler::TakeSession(const char* func) {
    if (!SetupPlayerSignals()) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, __LINE__, func,
                    "Failed to setup signal handler.\n");
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return false;
    }
    if (g_PlayerSessionId.empty()) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, __LINE__, func,
                    "Failed to get session ID.\n");
    } else if (!WritePlayerPidFile()) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, __LINE__, func,
                    "Failed to write pid file.\n");
    } else {
        return true;
    }
    SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
    PrintWarningRedirect();
    return false;
}

void PrintWarningRedirect() {
    // The line feed that puts adds completes the empty line after the header.
    std::puts("Location: /webman/3rdparty/Lookhaven/resources/images/2x/components/icon_indicator_warning.png\r\n\r");
}
