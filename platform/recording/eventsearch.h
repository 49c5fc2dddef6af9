// SPDX-License-Identifier: Apache-2.0
//
// Search for recorded events, and the log of which seconds were recorded.
#pragma once

#include <cstdint>
#include <list>
#include <set>
#include <string>

#include <json/json.h>

#include "platform/export.h"
#include "platform/recording/event.h"

// Which events to list; a fresh one asks for all of them.
struct LH_PLATFORM_API EventFilterParam {
    EventFilterParam();

    int m_MountId;            // 0: every mount
    int m_Offset;             // events to leave out at the list's head
    std::int64_t m_BeginTm;   // events that touch the span from here …
    std::int64_t m_EndTm;     // … up to, not including, here; seconds since the epoch (UTC)
    std::set<int> m_CamIds;   // of these cameras; empty: of none
    std::uint8_t m_Reason;    // REC_METHOD; 0: any
    int m_RecordingState;     // 0: all, 2: finished only
    int m_CamVdoType;         // the camera's own CAM_VIDEO_TYPE, for lists of one camera; does not filter
    std::string m_CamColumn;  // the column that holds the camera's id
};

// Appends the events that the filter names, by start and id. Returns 0, or non-zero when they cannot be read.
LH_PLATFORM_API int EventListGetAll(std::list<Event>& events, EventFilterParam& filter);

// One byte for each second from "from" on: 0 where nothing was recorded. duration: bytes of the buffer. Returns 0 when
// all of them are written; non-zero when there is no log.
LH_PLATFORM_API int ReadRecLog(const std::string& storagePath, long from, int duration, unsigned char* buffer);

// Makes the map that a timeline draws of the recording log and the seconds that events cover (0xFF), a value for each
// "interval" seconds; an interval below 1 is taken as 1.
LH_PLATFORM_API void FillRecLogMap(const unsigned char* recLog, const unsigned char* eventCoverage, int duration,
                                   int interval, Json::Value& out);

// The numbers of the text between the delimiters, in order; what is no number is left out. Keeps the first 4,096.
LH_PLATFORM_API std::list<int> String2IntList(const std::string& text, const std::string& delimiter);
