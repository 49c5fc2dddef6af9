// SPDX-License-Identifier: Apache-2.0
//
// Plays an event between two frame numbers.
#include <algorithm>

#include "platform/recording/event.h"
#include "player/mjpegstreamer/event_file.h"
#include "player/mjpegstreamer/frame_stream.h"
#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"
#include "player/wrapped.h"

namespace {

// Returns 0 once the stream has ended, -1 when it could not start.
int StreamOut(const std::string& path, int frameStart, int frameStop, long long timestamp, int playRate, int interval) {
    FrameStream stream(timestamp);
    if (!stream.Open(path) || !stream.Read(frameStart)) {
        return -1;
    }
    const int stop = frameStart > frameStop ? stream.GetLastIndex() : frameStop;
    stream.GetProgress().Set(playRate);
    stream.StartPace(playRate, interval);
    if (stop < frameStart || g_PlayerStop != 0) {
        return 0;
    }
    int current = frameStart;
    do {
        stream.SendIndex(current);
        stream.SendPicture();
        stream.FollowRate();
        if (stream.IsSessionGone()) {
            break;
        }
        // At the end the last picture is held: it is sent again until the player is stopped.
        current = std::min(Wrapped(std::int64_t{current} + stream.NextStride()), stop);
    } while (stream.Read(current) && g_PlayerStop == 0);
    return 0;
}

std::string GetFilename(int mountId, int eventId, REC_EVENT_TYPE kind) {
    return kind == REC_EVENT_ALERT ? GetAlertEventFilename(eventId)
           : kind == REC_EVENT_POS ? GetPosEventFilename(eventId)
                                   : GetRecordedFilename(mountId, eventId);
}

// Returns 0 when the event was played, -1 when its file is missing or the stream could not start.
int PlayEvent(int mountId, int eventId, REC_EVENT_TYPE kind, int frameStart, int frameStop, long long timestamp,
              int playRate, int interval) {
    const std::string name = GetFilename(mountId, eventId, kind);
    if (!IsFileExist(name)) {
        return -1;
    }
    return StreamOut(name, frameStart, frameStop, timestamp, playRate, interval) == 0 ? 0 : -1;
}

}  // namespace

void MjpegStreamHandler::HandlePlayEvent() {
    const int mountId = m_pRequest->GetParam("mountid", "0").asInt();
    const int eventId = m_pRequest->GetParam("eventid", "0").asInt();
    const int frameStart = m_pRequest->GetParam("framestart", "0").asInt();
    const int frameStop = m_pRequest->GetParam("framestop", "-1").asInt();
    const int playRate = m_pRequest->GetParam("playrate", "1").asInt();
    const int interval = m_pRequest->GetParam("interval", "-1").asInt();
    const long long timestamp = m_pRequest->GetParam("timestamp", "0").asInt();
    const bool isAnalytics = m_pRequest->GetParam("blAnalyEvent", false).asBool();
    auto kind = static_cast<REC_EVENT_TYPE>(m_pRequest->GetParam("recEvtType", 0).asInt());
    if (kind == REC_EVENT_RECORDED && isAnalytics) {
        kind = REC_EVENT_ALERT;
    }

    if (eventId < 1 || frameStart < 0 || timestamp < 1) {
        LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Invalid input\n");
        SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
        PrintWarningRedirect();
    } else if (TakeSession(__func__)) {
        if (PlayEvent(mountId, eventId, kind, frameStart, frameStop, timestamp, playRate == 0 ? 1 : playRate,
                      interval) != 0) {
            PrintWarningRedirect();
        }
        if (g_PlayerCheckPid == 0 && !RemovePlayerPidFile()) {
            LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Fail to remove file. [%s]\n",
                     PlayerPidFile().c_str());
        }
    }
    Answer(Json::Value());
}
