// SPDX-License-Identifier: Apache-2.0
//
// Finds the days on which recordings exist.
//
// Why so        Days are plain steps of 86,400 s from the start that the client chose. Times are 32-bit and wrap, and a
//               difference of days is truncated toward zero: an event that ended less than a day before the start
//               counts for the first day. Counts of days are computed in 64 bits, so that no slot outside the table is
//               touched.
#include <algorithm>
#include <array>
#include <cstdlib>
#include <list>

#include "platform/recording/eventsearch.h"
#include "player/multiplayer/multiplayer.h"
#include "player/wrapped.h"

namespace {

constexpr int kMaxDays = 128;
constexpr int kDaySec = 86400;

// The ids in the text that are those of cameras. Anything between a number and the next comma is ignored.
std::set<int> ListedCameras(const std::string& text, const std::map<int, Camera>& cameras) {
    std::set<int> ids;
    for (std::size_t token = 0; token <= text.size();) {
        const long long number = std::strtoll(text.c_str() + token, nullptr, 10);
        const auto found = cameras.find(Wrapped(number));
        if (found != cameras.end() && found->first == number && found->second.m_Id != 0) {
            ids.insert(found->first);
        }
        token = std::min(text.find(',', token), text.size()) + 1;
    }
    return ids;
}

int DaysBetween(int start, int time) {
    return Wrapped(std::int64_t{time} - start) / kDaySec;
}

// dayCount numbers, 1 for a day that some event touches, else 0; null when dayCount is below 1.
Json::Value MarkDays(const std::list<Event>& events, int start, int dayCount) {
    std::array<int, kMaxDays> days = {};
    for (const Event& event : events) {
        const std::int64_t last =
            std::min<std::int64_t>(DaysBetween(start, event.GetEndTm()), std::int64_t{dayCount} - 1);
        for (std::int64_t day = std::max(DaysBetween(start, event.GetStartTm()), 0); day <= last; ++day) {
            days[static_cast<std::size_t>(day)] = 1;
        }
    }
    Json::Value available;
    for (int day = 0; day < dayCount; ++day) {
        available.append(days[static_cast<std::size_t>(day)]);
    }
    return available;
}

}  // namespace

void MultiPlayerHandler::HandleSearchAvaiDate() {
    EventFilterParam filter;
    filter.m_MountId = m_pRequest->GetParam("mount_id", 0).asInt();
    filter.m_Offset = 0;
    const int dayCount = std::min(m_pRequest->GetParam("day_count", 1).asInt(), kMaxDays);
    const int start = m_pRequest->GetParam("start", 0).asInt();
    const int camGroupId = m_pRequest->GetParam("camGrpId", 0).asInt();
    const unsigned int uid = GetPrivUid();
    const PrivProfile profile = PrivProfileGetByUid(uid);
    if (!CheckProfile(profile, uid, __func__)) {
        return Answer(Json::Value());
    }
    const std::set<int> deniedCams = profile.GetInaCamIdSet(CAM_PRIV_PLAYBACK, true);
    const std::set<int> deniedGroups = profile.GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK);
    std::map<int, Camera> cameras;
    if (!ChooseCameras({camGroupId, filter.m_MountId, deniedCams, deniedGroups, __func__}, cameras)) {
        return Answer(Json::Value());
    }
    filter.m_CamIds = ListedCameras(m_pRequest->GetParam("cameralists", "").asString(), cameras);
    filter.m_BeginTm = start;
    filter.m_EndTm = Wrapped(start + std::int64_t{dayCount} * kDaySec);
    filter.m_CamColumn = "camera_id";
    std::list<Event> events;
    if (!filter.m_CamIds.empty()) {
        EventListGetAll(events, filter);
    }
    Json::Value result;
    result["search_time"] = start;
    result["available_day"] = MarkDays(events, start, dayCount);
    Answer(result);
}
