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
    // Arms the signals and makes this process the session's player. False after a log line under func and an error.
    bool TakeSession(const char* func);
};

// Sends the client to a warning picture in place of the video, where nothing has been sent yet.
void PrintWarningRedirect();
