// SPDX-License-Identifier: Apache-2.0
//
// Plays a recorded event between two times.
#include "platform/recording/event.h"
#include "player/mjpegstreamer/event_file.h"
#include "player/mjpegstreamer/frame_stream.h"
#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"
#include "player/wrapped.h"

namespace {

// Returns 0 once the stream has ended, -1 when it could not start. changeRate: the channel carries the rate, which the
// client sets; otherwise the time of the picture being sent.
int StreamOut(const std::string& path, int startTimeMS, int stopTimeMS, long long timestamp, int playRate,
              bool changeRate, int interval) {
    FrameStream stream(timestamp);
    if (!stream.Open(path)) {
        return -1;
    }
    JpegExtractor& extractor = stream.GetExtractor();
    const int start = extractor.GetFrameIdx(startTimeMS);
    const int asked = extractor.GetFrameIdx(stopTimeMS);
    if (!stream.Read(start)) {
        return -1;
    }
    const int stop = start > asked ? stream.GetLastIndex() : asked;
    if (changeRate) {
        stream.GetProgress().Set(playRate);
    }
    stream.StartPace(playRate, interval);
    if (stop < start || g_PlayerStop != 0) {
        return 0;
    }
    int current = start;
    do {
        if (interval >= 0) {
            stream.SendIndex(current);
        }
        stream.SendPicture();
        if (changeRate) {
            stream.FollowRate();
        } else if (stream.GetProgress().Set(extractor.GetTimeMS(current)) != 0) {
            break;
        }
        if (stream.IsSessionGone()) {
            break;
        }
        // The index is one ahead of the picture in the buffer; a pause takes that step back.
        current = Wrapped(std::int64_t{current} + stream.NextStride() - 1);
        if (interval >= 0 && current >= stop) {
            current = Wrapped(std::int64_t{stop} - 1);
        }
        if (g_PlayerPause != 0 && current > 0) {
            --current;
        }
        if (!stream.Read(current)) {
            break;
        }
        current = Wrapped(std::int64_t{current} + 1);
    } while (current <= stop && g_PlayerStop == 0);
    return 0;
}

// Returns 0 when the event was played, -1 when its file is missing or the stream could not start.
int PlayEvent(int mountId, int eventId, int startTimeMS, int stopTimeMS, long long timestamp, int playRate,
              bool changeRate, int interval) {
    const std::string name = GetRecordedFilename(mountId, eventId);
    if (!IsFileExist(name)) {
        return -1;
    }
    return StreamOut(name, startTimeMS, stopTimeMS, timestamp, playRate, changeRate, interval) == 0 ? 0 : -1;
}

// Makes an event that is still being recorded playable up to now; best effort. False when there is no such event.
bool FlushEvent(int mountId, int eventId) {
    Event event;
    if (event.Load(eventId, mountId, 0, 0) != 0) {
        return false;
    }
    if (event.GetId() >= 1 && event.GetRecording()) {
        DoEventTimelyPlay(event, REC_EVENT_RECORDED);
    }
    return true;
}

}  // namespace

void MjpegStreamHandler::HandlePlayEventNoFrameId() {
    const int mountId = m_pRequest->GetParam("mountid", 0).asInt();
    const int eventId = m_pRequest->GetParam("eventid", 0).asInt();
    const int startTimeMS = Wrapped(m_pRequest->GetParam("startTimeMS", 0).asInt64());
    const int stopTimeMS = Wrapped(m_pRequest->GetParam("stopTimeMS", -1).asInt64());
    const int playRate = m_pRequest->GetParam("playrate", 1).asInt();
    const bool changeRate = m_pRequest->GetParam("changerate", 0).asInt() != 0;
    const int interval = m_pRequest->GetParam("interval", -1).asInt();
    const bool flush = m_pRequest->GetParam("flushHeader", 0).asInt() == 1;
    const long long timestamp = m_pRequest->GetParam("timestamp", 0).asInt64();

    if (eventId < 1 || startTimeMS < 0 || timestamp < 1) {
        // No error code here: the redirect is all that the client gets.
        LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Invalid input\n");
        PrintWarningRedirect();
    } else if (TakeSession(__func__)) {
        if (flush && !FlushEvent(mountId, eventId)) {
            LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Failed to load event[%d] on mount[%d].\n",
                     eventId, mountId);
            SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
            return Answer(Json::Value());
        }
        if (PlayEvent(mountId, eventId, startTimeMS, stopTimeMS, timestamp, playRate == 0 ? 1 : playRate, changeRate,
                      interval) != 0) {
            LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Failed to play event.\n");
            PrintWarningRedirect();
        }
        if (g_PlayerCheckPid == 0 && !RemovePlayerPidFile()) {
            LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Failed to remove pid file.\n");
        }
    }
    Answer(Json::Value());
}
