// SPDX-License-Identifier: Apache-2.0
//
// The list of cameras that a client may watch, with what it needs to open each of them.
#pragma once

#include "webapi/include/lhwebapihandler.h"

class LiveviewHandler : public LHHandlerBase<LiveviewHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Serves the method "LoadCamera"; any other leaves the response alone.
    void HandleProcess();
    // Returns 0, or -1 after a log line, with the response left alone.
    int HandleLiveviewLoad();
    // Answers with the cameras that uid may watch. camId: the camera to select, listed or not; 0 for the first enabled
    // MJPEG camera. Returns 0, or -1 after a log line, with the response left alone.
    int SendCamerasData(int camId, unsigned int uid, bool showAll);
};
