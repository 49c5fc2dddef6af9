// SPDX-License-Identifier: Apache-2.0
//
// Search for recorded events, and the recording log: which seconds of a camera were recorded.
#pragma once

#include <cstdint>
#include <list>
#include <set>
#include <string>

#include <json/json.h>

#include "platform/export.h"
#include "platform/recording/event.h"

// Which events to list. A default-constructed filter restricts nothing but the cameras: it names none.
struct LH_PLATFORM_API EventFilterParam {
    EventFilterParam();

    int m_MountId;            // 0: every mount
    int m_Offset;             // events to skip at the beginning of the list
    std::int64_t m_BeginTm;   // events that overlap the span from here …
    std::int64_t m_EndTm;     // … up to, not including, here; seconds since the epoch (UTC)
    std::set<int> m_CamIds;   // of these cameras; empty: of none
    std::uint8_t m_Reason;    // REC_METHOD; 0: any
    int m_RecordingState;     // 0: all, 2: finished only
    int m_CamVdoType;         // the camera's own CAM_VIDEO_TYPE, for lists of one camera; does not filter
    std::string m_CamColumn;  // the column that holds the camera's id
};

// Appends the events that match the filter, in order of start and id, without those that the caller may not play back.
// Returns 0. Throws when they cannot be read, or not held in memory: the module takes the list for all that there is.
LH_PLATFORM_API int EventListGetAll(std::list<Event>& events, EventFilterParam& filter);

// Stores one byte for each second from "from" on (seconds since the epoch), 0 where nothing was recorded. duration:
// seconds, and bytes of the buffer, all of which are written when it returns 0. Non-zero when there is no log: the
// buffer may still hold another camera's.
LH_PLATFORM_API int ReadRecLog(const std::string& storagePath, long from, int duration, unsigned char* buffer);

// Builds the map that a timeline draws from the recording log and from the seconds that events cover (0xFF), one value
// per "interval" seconds; an interval below 1 is taken as 1. Both buffers have duration bytes.
LH_PLATFORM_API void FillRecLogMap(const unsigned char* recLog, const unsigned char* eventCoverage, int duration,
                                   int interval, Json::Value& out);

// The integers between the delimiters, in order and with duplicates; anything else is skipped. Returns at most the
// first 4,096.
LH_PLATFORM_API std::list<int> String2IntList(const std::string& text, const std::string& delimiter);
