// SPDX-License-Identifier: Apache-2.0
//
// The per-process part of the log filter and the names of categories and levels.
#include "webapi/include/diaglog.h"

#include <algorithm>

#include <unistd.h>

bool ChkPidLevel(LOG_LEVEL level) {
    if (g_pDbgLogCfg == nullptr) {
        return false;
    }
    if (g_DbgLogPid == 0) {
        g_DbgLogPid = getpid();
    }
    int threshold = 0;
    // Another process writes the count: it must not lead beyond the table.
    const int count = std::min(g_pDbgLogCfg->m_PidCount, DBG_LOG_PID_COUNT);
    for (int i = 0; i < count; ++i) {
        const DbgLogPidLevel& entry = g_pDbgLogCfg->m_PidLevel[i];
        if (entry.m_Pid == g_DbgLogPid) {
            threshold = entry.m_Level;
            break;
        }
    }
    return level <= threshold;
}

template <typename T>
const char* Enum2String(T value) {
    static const LHEnum2StrMap<T> map;
    const auto found = map.m_Names.find(value);
    return found == map.m_Names.end() ? "unknown" : found->second;
}

template const char* Enum2String(LOG_CATEG);
template const char* Enum2String(LOG_LEVEL);
