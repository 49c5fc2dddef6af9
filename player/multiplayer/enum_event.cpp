// SPDX-License-Identifier: Apache-2.0
//
// Lists the events of a time span, with a map of its recorded seconds.
//
// Invariants    (1) The span is from one second to 32 days, which bounds the two buffers of one byte per second.
//               (2) Nothing is marked outside the buffer: see MarkCoverage.
#include <algorithm>
#include <cstring>
#include <list>
#include <vector>

#include "platform/recording/eventsearch.h"
#include "player/multiplayer/multiplayer.h"
#include "player/wrapped.h"

namespace {

constexpr int kMaxSpanSec = 32 * 86400;
constexpr int kRecordingStateAll = 0;
constexpr int kRecordingStateFinished = 2;

// A name that lives as long as the program is not copied into each of thousands of objects.
using Key = Json::StaticString;

Json::Value DescribeEvent(const Event& event, bool withAudio) {
    Json::Value description;
    description[Key("id")] = event.GetId();
    description[Key("id_on_RecServer")] = event.GetIdOnRecServer();
    description[Key("name")] = event.GetPath();
    description[Key("startTime")] = event.GetStartTm();
    description[Key("stopTime")] = event.GetEndTm();
    description[Key("frameCount")] = event.GetFrameCount();
    description[Key("video_type")] = event.GetVdoType();
    description[Key("record_type")] = event.GetRecMethod();
    description[Key("audio_format")] = withAudio ? event.GetAudFmt() : "";
    description[Key("img_width")] = event.GetImgW();
    description[Key("img_height")] = event.GetImgH();
    description[Key("is_recording")] = event.GetRecording();
    description[Key("archived")] = event.GetArchived();
    description[Key("event_size")] = static_cast<double>(event.GetSize()) * 0x1p-20;
    description[Key("fisheye_origin_view")] = event.IsOriginalView();
    // Older and newer clients read the same three values under different names.
    description[Key("start")] = event.GetStartTm();
    description[Key("stop")] = event.GetEndTm();
    description[Key("frame_count")] = event.GetFrameCount();
    return description;
}

// Kinds 1 to 6 and 10.
bool IsCovering(int recMethod) {
    return static_cast<std::uint8_t>(static_cast<unsigned int>(recMethod) - 1U) <= 5 || recMethod == 10;
}

// An event that began before the span covers its whole length from the beginning of the span on.
void MarkCoverage(const Event& event, int from, std::vector<unsigned char>& coverage) {
    const int offset = std::max(Wrapped(std::int64_t{event.GetStartTm()} - from), 0);
    const int length = std::min(Wrapped(std::int64_t{event.GetEndTm()} - event.GetStartTm()),
                                static_cast<int>(coverage.size()) - offset);
    if (length > 0) {
        std::memset(coverage.data() + offset, 0xff, static_cast<std::size_t>(length));
    }
}

// The search on one camera; the buffers are reused for the next.
struct CameraSearch {
    const Camera& m_Camera;
    int m_From;
    int m_Interval;
    bool m_blAudio;
    std::vector<unsigned char>& m_RecLog;
    std::vector<unsigned char>& m_Coverage;

    void Fill(EventFilterParam& filter, Json::Value& entry) const {
        std::list<Event> events;
        EventListGetAll(events, filter);
        std::fill(m_Coverage.begin(), m_Coverage.end(), static_cast<unsigned char>(0));
        Json::Value& descriptions = entry["event"] = Json::Value(Json::arrayValue);
        for (const Event& event : events) {
            descriptions.append(DescribeEvent(event, m_blAudio));
            if (IsCovering(event.GetRecMethod())) {
                MarkCoverage(event, m_From, m_Coverage);
            }
        }
        const int duration = static_cast<int>(m_Coverage.size());
        if (ReadRecLog(m_Camera.GetStoragePath(), m_From, duration, m_RecLog.data()) == 0) {
            FillRecLogMap(m_RecLog.data(), m_Coverage.data(), duration, m_Interval, entry["event_map"]);
        }
        entry["total"] = static_cast<Json::UInt>(events.size());
    }
};

}  // namespace

void MultiPlayerHandler::HandleEnumEvent() {
    const int mountId = m_pRequest->GetParam("mount_id", 0).asInt();
    const int camGroupId = m_pRequest->GetParam("camGrpId", 0).asInt();
    const int from = m_pRequest->GetParam("from", 0).asInt();
    const int to = m_pRequest->GetParam("to", 0).asInt();
    const int interval = m_pRequest->GetParam("interval", 5).asInt();
    const bool withRecording = m_pRequest->GetParam("recording", false).asBool();
    const int reason = m_pRequest->GetParam("reason", 0).asInt();
    const std::string camList = m_pRequest->GetParam("cameralists", "").asString();
    const int duration = Wrapped(std::int64_t{to} - from);
    const unsigned int uid = GetPrivUid();
    const PrivProfile profile = PrivProfileGetByUid(uid);
    if (duration < 1 || duration > kMaxSpanSec) {
        LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMultiPlayerSource, "Error time duration.\n");
        SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
        return Answer(Json::Value());
    }
    if (!CheckProfile(profile, uid, __func__)) {
        return Answer(Json::Value());
    }
    const std::set<int> deniedCams = profile.GetInaCamIdSet(CAM_PRIV_PLAYBACK, true);
    const std::set<int> mutedCams = profile.GetInaCamIdSet(CAM_PRIV_AUDIO, true);
    const std::set<int> deniedGroups = profile.GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK);
    std::map<int, Camera> cameras;
    if (!ChooseCameras({camGroupId, mountId, deniedCams, deniedGroups, __func__}, cameras)) {
        return Answer(Json::Value());
    }

    std::vector<unsigned char> recLog(static_cast<std::size_t>(duration));
    std::vector<unsigned char> coverage(static_cast<std::size_t>(duration));
    Json::Value result;
    result["camera"] = Json::Value(Json::arrayValue);
    for (const int id : String2IntList(camList, ",")) {
        const auto camera = cameras.find(id);
        if (id < 1 || camera == cameras.end()) {
            continue;
        }
        Json::Value& entry = result["camera"].append(Json::Value());
        EventFilterParam filter;
        filter.m_MountId = mountId;
        filter.m_BeginTm = from;
        filter.m_EndTm = to;
        filter.m_CamIds = {id};
        filter.m_Reason = static_cast<std::uint8_t>(reason);
        filter.m_RecordingState = withRecording ? kRecordingStateAll : kRecordingStateFinished;
        filter.m_CamColumn = "camera_id";
        filter.m_CamVdoType = camera->second.m_VideoType;
        CameraSearch{camera->second, from, interval, mutedCams.count(id) == 0, recLog, coverage}.Fill(filter, entry);
        entry["camera_id"] = id;
    }
    Answer(result);
}
