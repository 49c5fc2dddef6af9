// SPDX-License-Identifier: Apache-2.0
//
// The logger, its enums and their names.
#pragma once

#include <map>

#include "platform/export.h"

// The log that a line goes to; 0 is the recorder's own log.
enum LOG_TYPE : int { LOG_TYPE_DEFAULT = 0 };

// The subject of a line.
enum LOG_CATEG : int {
    LOG_CATEG_LIVEVIEW = 32,
    LOG_CATEG_PLAYER = 68,
};

// The verbosity of a line; a larger number is more verbose.
enum LOG_LEVEL : int {
    LOG_LEVEL_ERR = 1,
    LOG_LEVEL_WARN = 3,
    LOG_LEVEL_NOTICE = 4,
    LOG_LEVEL_INFO = 5,
    LOG_LEVEL_DEBUG = 6,
};

// Writes one line without filtering: the module has done that. categName and levelName are null for an unconditional
// line; file is a source name without extension; fmt ends in a line feed. Never writes to standard output, which
// carries the response.
LH_PLATFORM_API void LHPrintf(LOG_TYPE type, const char* categName, const char* levelName, const char* file, int line,
                              const char* func, const char* fmt, ...) __attribute__((format(printf, 7, 8)));

// The names of an enum's values, filled by the platform's constructor. Values may be missing.
template <typename T>
class LH_PLATFORM_API LHEnum2StrMap {
  public:
    LHEnum2StrMap();

    std::map<T, const char*> m_Names;
};
template <>
LHEnum2StrMap<LOG_CATEG>::LHEnum2StrMap();
template <>
LHEnum2StrMap<LOG_LEVEL>::LHEnum2StrMap();
