// SPDX-License-Identifier: Apache-2.0
//
// Playback of recorded events as a multipart stream of JPEG pictures.
//
// Thread safety One request per process: the flags that signals set belong to the process.
#pragma once

#include "webapi/include/lhwebapihandler.h"

// The source that the player's log lines name.
inline constexpr char kMjpegStreamerSource[] = "mjpegstreamer";

class MjpegStreamHandler : public LHHandlerBase<MjpegStreamHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Serves "PlayMjpegEvent" and "PlayMjpegEventNoFrameId"; any other method does nothing.
    void HandleProcess();
    // Plays a recorded, alert or POS event between two frame numbers. Ends with an answer on the response.
    void HandlePlayEvent();
    // Plays a recorded event between two times, in milliseconds of the recording. Ends with an answer on the response.
    void HandlePlayEventNoFrameId();

  private:
    // Installs the signal handlers and makes this process the session's player. False after a log line that names func
    // and a recorded error.
    bool TakeSession(const char* func);
};

// Redirects the client to a warning picture in place of the video. Only before anything else is written.
void PrintWarningRedirect();
