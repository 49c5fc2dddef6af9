// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform's event search and sets of cameras.
#include <algorithm>

#include "platform/camera/camgroup.h"
#include "platform/recording/eventsearch.h"
#include "player/iter2string.h"
#include "test/support/platform/record.h"

using lookhaven::test::Call;
using lookhaven::test::Script;

CamGroup::CamGroup() : m_Id(0) {}
int CamGroup::Load(int groupId) {
    m_Id = groupId;
    return Call("CamGroup::Load", groupId), Script().group_result;
}
std::map<int, Camera> CamGroup::GetCamMap() const {
    return Call("GetCamMap", m_Id), Script().group_cameras;
}
std::map<int, Camera> GetCamMountMap(int mountId, const std::string& deniedIds, bool withDeleted) {
    return Call("GetCamMountMap", mountId, deniedIds, withDeleted), Script().mount_cameras;
}

// Values that show which fields a handler leaves at their defaults.
EventFilterParam::EventFilterParam()
    : m_MountId(-1),
      m_Offset(-1),
      m_BeginTm(-1),
      m_EndTm(-1),
      m_Reason(99),
      m_RecordingState(-1),
      m_CamVdoType(-1) {}
int EventListGetAll(std::list<Event>& events, EventFilterParam& filter) {
    Call("EventListGetAll", filter.m_MountId, filter.m_Offset, filter.m_BeginTm, filter.m_EndTm,
         Iter2String(filter.m_CamIds.begin(), filter.m_CamIds.end(), "+"), int{filter.m_Reason},
         filter.m_RecordingState, filter.m_CamVdoType, filter.m_CamColumn);
    events = Script().found_events;
    return 0;
}
int ReadRecLog(const std::string& storagePath, long from, int duration, unsigned char* buffer) {
    Call("ReadRecLog", storagePath, from, duration);
    std::fill_n(buffer, duration, static_cast<unsigned char>('L'));
    return Script().rec_log_result;
}
void FillRecLogMap(const unsigned char* recLog, const unsigned char* eventCoverage, int duration, int interval,
                   Json::Value& out) {
    const bool is_log = std::count(recLog, recLog + duration, 'L') == duration;
    std::string seconds;
    std::transform(eventCoverage, eventCoverage + duration, std::back_inserter(seconds), [](unsigned char second) {
        return second == 0xff ? 'X' : second == 0 ? '.' : '?';
    });
    Call("FillRecLogMap", is_log ? "log" : "?", seconds, interval);
    out = "map";
}
std::list<int> String2IntList(const std::string& text, const std::string& delimiter) {
    std::list<int> ids;
    Call("String2IntList", text, delimiter);
    for (std::size_t begin = 0; begin < text.size();) {
        ids.push_back(std::stoi(text.substr(begin)));
        begin = std::min(text.find(delimiter, begin), text.size() - 1) + 1;
    }
    return ids;
}
