// SPDX-License-Identifier: Apache-2.0
//
// Runs live view requests against the scripted platform.
#pragma once

#include <string>

#include <gtest/gtest.h>

#include "player/liveview_src/liveview_src.h"
#include "test/support/platform/scripted_platform.h"

namespace lookhaven::test {

struct LiveHandler : LiveviewSrcHandler {
    explicit LiveHandler(ScriptedPlatform& platform) : LiveviewSrcHandler(platform.Request(), platform.Response()) {}
    using LHWebAPIHandler::m_bPairAuth;
    using LHWebAPIHandler::m_ErrCode;
};

// A "Play" request of an admitted caller for camera 5, which streams MJPEG.
struct LiveView : ScriptedPlatform {
    LiveView() {
        gblStop = 0;
        is_authorized = has_app_priv = true;
        method = "Play";
        cameras[5] = MakeCamera(5, CAM_VIDEO_MJPEG);
        params["camera"] = 5;
    }
    ~LiveView() { gblStop = 0; }
};

struct LoopRow {
    const char* name;
    Change before;
    Calls calls;  // from the first StartRead on
};

inline void Stop(ScriptedPlatform&) {
    gblStop = 1;
}
inline Change Pictures(const ScriptedFrames& frames) {
    return [frames](ScriptedPlatform& p) { p.frames = frames; };
}
inline Change Later(int seconds) {
    return [seconds](ScriptedPlatform& p) { p.now += seconds; };
}

// The size of one frame of a ring, and whether it is in range.
struct SizeRow {
    int length, offset;
    bool sent;
};

inline const SizeRow kSizes[] = {
    {0, 0, false},       {9, 9, false},        {1, 0, true}, {4, 5, false}, {4194303 + 44, 44, true},
    {4194304, 0, false}, {4, INT32_MIN, false}};

// Plays the row as stream 51 of camera 5. func: the handler's function, which each log line names.
inline void RunLoop(const LoopRow& row, const char* func, const std::function<void(LiveHandler&)>& stream) {
    SCOPED_TRACE(row.name);
    LiveView platform;
    platform.log_cfg.m_CategLevel[32] = 5;
    row.before(platform);
    LiveHandler handler(platform);
    stream(handler);
    EXPECT_EQ(platform.CallsFrom("StartRead"), row.calls);
    EXPECT_EQ(handler.m_ErrCode, 0);
    for (const auto& log : platform.logs) {
        EXPECT_EQ(log.file + " " + log.func, std::string("liveview_src ") + func);
    }
    EXPECT_EQ(pthread_mutex_trylock(&platform.common_cfg.m_Mutex), 0) << "neither held nor inconsistent";
    pthread_mutex_unlock(&platform.common_cfg.m_Mutex);
}

// What the MJPEG loop calls: its begin, a pass that finds no picture, its end.
inline const Calls kStart = {"StartRead(position)"};
inline Calls Read(int last_seq) {
    return {"UpdateStamp()", "ReadLatest(" + std::to_string(last_seq) + ",position)"};
}
inline Calls Empty(int last_seq) {
    return Read(last_seq) + Calls{"ReadFinish(null,1,position)", "usleep(10000)"};
}
inline const Calls kClose = {"StopRead(position)", "shmdt()", "SetEnableOutput(0)"};

// The line that ends the loop.
inline Calls LoopExit(const char* eof, const char* error, const char* stop) {
    return {std::string("log live/5 Exit loop [Cam: 5, feof: ") + eof + ", ferror: " + error + ", gblStop: " + stop +
            "]\n"};
}

}  // namespace lookhaven::test
