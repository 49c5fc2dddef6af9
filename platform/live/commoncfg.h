// SPDX-License-Identifier: Apache-2.0
//
// The recording service's common configuration in shared memory.
#pragma once

#include <cstdint>

#include <pthread.h>

#include "platform/export.h"

struct LHShmCommonCfg {
    pthread_mutex_t m_Mutex;   // process-shared, robust; guards the rest
    std::int64_t m_Timestamp;  // monotonic seconds when the service last refreshed the record
    std::uint8_t m_blPause;    // non-zero: streams pause
};

// The record, attached once per process and never detached; null while the recording service has none.
LH_PLATFORM_API LHShmCommonCfg* LHShmCommonCfgAt();

// Seconds of the monotonic clock.
LH_PLATFORM_API long GetMonoTimeSec();
