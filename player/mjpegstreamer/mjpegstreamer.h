// SPDX-License-Identifier: Apache-2.0
//
// Playback of recorded events as a multipart stream of JPEG pictures.
#pragma once

#include "webapi/include/lhwebapihandler.h"

class MjpegStreamHandler : public LHHandlerBase<MjpegStreamHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Serves "PlayMjpegEvent" and "PlayMjpegEventNoFrameId"; any other method does nothing.
    void HandleProcess();
    // Each ends with an answer on the response.
    void HandlePlayEvent();
    void HandlePlayEventNoFrameId();
};
