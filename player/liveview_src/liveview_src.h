// SPDX-License-Identifier: Apache-2.0
//
// A camera's live picture as one JPEG or as an endless stream, or the description of an e-map.
//
// Thread safety One request per process: the stop flag belongs to the process.
#pragma once

#include <atomic>

#include "webapi/include/lhwebapihandler.h"

// Non-zero once the process has been told to stop; never cleared.
extern std::atomic<unsigned char> gblStop;
static_assert(std::atomic<unsigned char>::is_always_lock_free, "a signal handler stores it");

// No operation returns a result. Failures are recorded with SetErrorCode, which this handler never sends: the client
// gets the framework's answer for a handler that set none.
class LiveviewSrcHandler : public LHHandlerBase<LiveviewSrcHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Admits the caller and serves the method "Play"; any other does nothing.
    void HandleProcess();
    void HandlePlay();
    // id: of an e-map when "itemType" is 1, else of a camera.
    void StartLiveview(int id);
    // Makes SIGINT, SIGQUIT, SIGTERM and SIGPIPE set gblStop, so that a stream shuts down in order and a closed
    // connection does not kill the process.
    void SetupSignalHandler();

    // Writes the newest picture of the camera's live profile with its own response head. MJPEG cameras only.
    void SnapshotMjpgCam(int camId);
    // Streams pictures until the client disconnects, the process is told to stop, or none was sent for 20 s.
    // fromPlugin: begins with an empty part, which that client expects.
    void LiveviewMjpgCam(int camId, int streamNo, bool fromPlugin);
    // Streams video and audio of a camera with another codec.
    void LiveviewMpeg4Cam(int camId, int streamNo);
    void LiveviewEmap(int emapId);
};
