// SPDX-License-Identifier: Apache-2.0
//
// Diagnostic log lines: unconditional ones for errors, and filtered ones, written only when the debug-log configuration
// admits their category and level.
//
// Why so        Streams trace each frame. A line that is not admitted must cost two comparisons only, so the filter is
//               a macro, and the line's arguments are evaluated after it.
// Thread safety Any thread.
#pragma once

#include "platform/log/dbglogcfg.h"
#include "platform/log/lhprintf.h"

// True when the configuration has a threshold for this process and level is not above it.
bool ChkPidLevel(LOG_LEVEL level);

// The name of a category or level, "unknown" for a value without one. Lives as long as the process.
template <typename T>
const char* Enum2String(T value);
extern template const char* Enum2String(LOG_CATEG);
extern template const char* Enum2String(LOG_LEVEL);

// True when a line of the category and level is to be written.
inline bool IsLogAdmitted(LOG_CATEG categ, LOG_LEVEL level) {
    return (g_pDbgLogCfg != nullptr && g_pDbgLogCfg->m_CategLevel[categ] >= level) || ChkPidLevel(level);
}

// An unconditional line. source: a name without extension; then a printf format and its arguments.
#define LH_LOG(source, ...) LH_LOG_AT(source, __LINE__, __func__, __VA_ARGS__)
// The same with a given line number and function, where these are part of the log's format.
#define LH_LOG_AT(source, line, func, ...) LHPrintf(LOG_TYPE_DEFAULT, nullptr, nullptr, source, line, func, __VA_ARGS__)

// A filtered line; no argument after level is evaluated unless it is admitted.
#define LH_TRACE(categ, level, source, ...) LH_TRACE_AT(categ, level, source, __LINE__, __func__, __VA_ARGS__)
#define LH_TRACE_AT(categ, level, source, line, func, ...)                                                             \
    do {                                                                                                               \
        if (IsLogAdmitted(categ, level)) {                                                                             \
            LHPrintf(LOG_TYPE_DEFAULT, Enum2String<LOG_CATEG>(categ), Enum2String<LOG_LEVEL>(level), source, line,     \
                     func, __VA_ARGS__);                                                                               \
        }                                                                                                              \
    } while (false)
