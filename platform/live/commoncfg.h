// SPDX-License-Identifier: Apache-2.0
//
// The recording service's common configuration in shared memory.
#pragma once

#include <cstdint>

#include <pthread.h>

#include "platform/export.h"

struct LHShmCommonCfg {
    pthread_mutex_t m_Mutex;   // process-shared, robust, error-checking; guards the rest
    std::int64_t m_Timestamp;  // when the service last refreshed the record: seconds as GetMonoTimeSec counts them
    std::uint8_t m_blPause;    // non-zero: streams pause
};

// The record, attached once per process and never detached; null until the recording service has created it. May be
// called for every frame.
LH_PLATFORM_API LHShmCommonCfg* LHShmCommonCfgAt();

// Seconds of the monotonic clock, which all processes of the host share.
LH_PLATFORM_API long GetMonoTimeSec();
