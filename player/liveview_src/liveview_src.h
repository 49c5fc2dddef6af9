// SPDX-License-Identifier: Apache-2.0
//
// A camera's live picture, as one JPEG or as an endless stream, or the description of an e-map.
//
// Thread safety One request per process: the stop flag belongs to the process.
#pragma once

#include <atomic>

#include "webapi/include/lhwebapihandler.h"

// Non-zero once the process has been told to stop; never cleared.
extern std::atomic<unsigned char> gblStop;
static_assert(std::atomic<unsigned char>::is_always_lock_free, "a signal handler stores it");

// No operation returns a result: failures are recorded with SetErrorCode, and what the client then gets is the
// framework's answer for a handler that gave none.
class LiveviewSrcHandler : public LHHandlerBase<LiveviewSrcHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Admits the caller and serves the method "Play"; any other does nothing.
    void HandleProcess();
    void HandlePlay();
    // id: of an e-map when "itemType" is 1, else of a camera.
    void StartLiveview(int id);
    // Has SIGINT, SIGQUIT, SIGTERM and SIGPIPE set gblStop, so that a stream ends in order and a closed connection does
    // not kill the process half way.
    void SetupSignalHandler();

    // Writes the newest picture of the camera's live profile with a head of its own.
    void SnapshotMjpgCam(int camId);
    // Streams pictures until the client goes, the process is told to stop, or none could be sent for 20 s. fromPlugin:
    // begins with an empty part, which that client waits for.
    void LiveviewMjpgCam(int camId, int streamNo, bool fromPlugin);
    // Streams video and audio of a camera with another codec.
    void LiveviewMpeg4Cam(int camId, int streamNo);
    void LiveviewEmap(int emapId);
};
