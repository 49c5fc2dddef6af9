// SPDX-License-Identifier: Apache-2.0
//
// Common to the loops of all live streams: when a pass may begin, how long a stream may stall.
#include "player/liveview_src/live_loop.h"

#include <cerrno>
#include <cstdio>
#include <stdexcept>

#include <pthread.h>
#include <unistd.h>

#include "platform/live/commoncfg.h"
#include "player/liveview_src/liveview_src.h"
#include "webapi/include/diaglog.h"

namespace {

constexpr unsigned int kPauseSec = 10;
constexpr useconds_t kRestMicrosec = 10000;
constexpr double kTimeoutSec = 20.0;
constexpr std::uint64_t kFreshSec = 86400;

std::uint64_t Distance(std::int64_t a, std::int64_t b) {
    return a > b ? static_cast<std::uint64_t>(a) - static_cast<std::uint64_t>(b)
                 : static_cast<std::uint64_t>(b) - static_cast<std::uint64_t>(a);
}

// True when the recording service has refreshed its record within a day and does not ask for a pause.
bool MayStream() {
    LHShmCommonCfg* cfg = LHShmCommonCfgAt();
    if (cfg == nullptr) {
        return false;
    }
    const std::int64_t now = GetMonoTimeSec();
    const int locked = pthread_mutex_lock(&cfg->m_Mutex);
    if (locked == EOWNERDEAD) {
        // The owner that died stores single numbers only, none of which can be half written.
        pthread_mutex_consistent(&cfg->m_Mutex);
    } else if (locked == EDEADLK) {
        throw std::runtime_error("Potential self-deadlock detected!");
    }
    const bool mayStream = Distance(now, cfg->m_Timestamp) <= kFreshSec && cfg->m_blPause == 0;
    pthread_mutex_unlock(&cfg->m_Mutex);
    return mayStream;
}

}  // namespace

LiveLoop::LiveLoop(int camId, const char* func) : m_CamId(camId), m_szFunc(func), m_LastWrite(std::time(nullptr)) {}

bool LiveLoop::BeginPass() const {
    while (feof(stdout) == 0) {
        if (ferror(stdout) != 0 || gblStop != 0) {
            return false;
        }
        if (MayStream()) {
            return true;
        }
        sleep(kPauseSec);
    }
    return false;
}

void LiveLoop::Flush() const {
    if (fflush(stdout) != 0) {
        const int error = errno;
        LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_NOTICE, kLiveviewSource, __LINE__, m_szFunc,
                    "Failed to fflush data [Cam: %d, errno: %d]\n", m_CamId, error);
    }
}

void LiveLoop::NoteWrite() {
    m_LastWrite = std::time(nullptr);
}

bool LiveLoop::Rest() const {
    if (std::difftime(std::time(nullptr), m_LastWrite) > kTimeoutSec) {
        LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_NOTICE, kLiveviewSource, __LINE__, m_szFunc, "Timeeout [Cam: %d]\n",
                    m_CamId);
        return false;
    }
    usleep(kRestMicrosec);
    return true;
}

void LiveLoop::LogExit() const {
    LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_INFO, kLiveviewSource, __LINE__, m_szFunc,
                "Exit loop [Cam: %d, feof: %d, ferror: %d, gblStop: %d]\n", m_CamId, feof(stdout), ferror(stdout),
                gblStop.load());
}
