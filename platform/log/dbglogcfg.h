// SPDX-License-Identifier: Apache-2.0
//
// The debug-log configuration, which another process maintains in shared memory: any value may change between two
// reads.
#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/export.h"

constexpr int DBG_LOG_CATEG_COUNT = 512;
constexpr int DBG_LOG_PID_COUNT = 256;

// The threshold of one process.
struct DbgLogPidLevel {
    std::int32_t m_Pid;
    std::int32_t m_Level;
};

// A level is admitted when it is not above the threshold. m_CategLevel is indexed by LOG_CATEG.
struct DbgLogCfg {
    std::int32_t m_Version;
    std::int32_t m_CategLevel[DBG_LOG_CATEG_COUNT];
    std::int32_t m_PidCount;  // entries of m_PidLevel in use
    DbgLogPidLevel m_PidLevel[DBG_LOG_PID_COUNT];
};
static_assert(offsetof(DbgLogCfg, m_CategLevel) == 4);
static_assert(offsetof(DbgLogCfg, m_PidCount) == 2052);
static_assert(offsetof(DbgLogCfg, m_PidLevel) == 2056);

// Null when logging is not set up.
LH_PLATFORM_API extern DbgLogCfg* g_pDbgLogCfg;

// The calling process's id as the log filter caches it; 0 until first needed.
LH_PLATFORM_API extern int g_DbgLogPid;
