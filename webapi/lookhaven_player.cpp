// SPDX-License-Identifier: Apache-2.0
//
// The table of the module's methods and the entry functions behind it.
#include "webapi/lookhaven_player.h"

#include "platform/admission/host.h"
#include "player/liveview/liveview.h"
#include "player/liveview_src/liveview_src.h"
#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/multiplayer/multiplayer.h"

namespace {

template <typename Handler>
void Serve(VEXO::APIRequest* request, VEXO::APIResponse* response) {
    Handler handler(request, response);
    handler.TakeRelayedCmd();
    LHTaskSet::SetAffinity("");
    handler.HandleProcess();
}

}  // namespace

const APIRow gTable[] = {
    {"VEXO.Lookhaven.Player", 1, "EnumEvent", Process},
    {"VEXO.Lookhaven.Player", 1, "SearchAvaiDate", Process},
    {"VEXO.Lookhaven.Player", 1, "PlayMjpegEvent", ProcessPlayEvent},
    {"VEXO.Lookhaven.Player", 1, "PlayMjpegEventNoFrameId", ProcessPlayEvent},
    {"VEXO.Lookhaven.Player", 1, "LoadCamera", ProcessLoadCamera},
    {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "Play", ProcessLiveviewSrc},
    {nullptr, 0, nullptr, nullptr},
};

const APIRow* GetAPITable() {
    return gTable;
}

void Process(VEXO::APIRequest* request, VEXO::APIResponse* response) {
    Serve<MultiPlayerHandler>(request, response);
}

void ProcessPlayEvent(VEXO::APIRequest* request, VEXO::APIResponse* response) {
    Serve<MjpegStreamHandler>(request, response);
}

void ProcessLoadCamera(VEXO::APIRequest* request, VEXO::APIResponse* response) {
    Serve<LiveviewHandler>(request, response);
}

void ProcessLiveviewSrc(VEXO::APIRequest* request, VEXO::APIResponse* response) {
    Serve<LiveviewSrcHandler>(request, response);
}
