// SPDX-License-Identifier: Apache-2.0
//
// Live view: what a request gets, how the stream's loop runs and ends, what a snapshot writes.
#include <cerrno>
#include <cstdint>
#include <stdexcept>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "player/liveview_src/liveview_src.h"
#include "test/support/platform/scripted_platform.h"

using lookhaven::test::Calls;
using lookhaven::test::MakeCamera;
using lookhaven::test::operator+;
using lookhaven::test::ScriptedFrame;
using lookhaven::test::ScriptedPlatform;
using lookhaven::test::StdoutCapture;
using testing::ElementsAre;
using testing::IsEmpty;
using Script = std::function<void(ScriptedPlatform&)>;

namespace {

struct ProbeHandler : LiveviewSrcHandler {
    explicit ProbeHandler(ScriptedPlatform& platform) : LiveviewSrcHandler(platform.Request(), platform.Response()) {}
    using LHWebAPIHandler::m_ErrCode;
};

// A "Play" request of an admitted caller for camera 5, which streams MJPEG.
struct LiveView {
    LiveView() {
        gblStop = 0;
        platform.is_authorized = platform.has_app_priv = true;
        platform.method = "Play";
        platform.cameras[5] = MakeCamera(5, CAM_VIDEO_MJPEG);
        platform.params["camera"] = 5;
    }
    ~LiveView() { gblStop = 0; }

    ScriptedPlatform platform;
};

const Calls kSignals = {"sigaction(2,0,no mask)", "sigaction(3,0,no mask)", "sigaction(15,0,no mask)",
                        "sigaction(13,0,no mask)"};
const Calls kDispatch = {"GetAPIMethod()", "GetParam(camera,0)", "GetParam(snapshot,0)"};
const Calls kItem = kDispatch + kSignals + Calls{"GetParam(itemType,0)"};
const Calls kCamera = kItem + Calls{"GetParam(isFromPlugin,0)", "GetParam(profileType,-1)", "Load(5,0,0)"};
const Calls kStream = {"StartLive(5,51)", "LiveStreamFifoAt(5,51)"};
// A pass that finds no picture and ends the output, and the way out of the loop.
const Calls kLastPass = {"UpdateStamp()", "ReadLatest(10001)", "ReadFinish(null,1,position)", "usleep(10000)"};
const Calls kStart = {"StartRead()"};
const Calls kClose = {"StopRead()", "shmdt()", "SetEnableOutput(0)"};

struct RequestRow {
    const char* name;
    Script script;
    int error;
    Calls calls;
};

TEST(LiveViewRequest, ReadsInOrderAndPicksTheOutput) {
    const Calls own_profile = kCamera + Calls{"GetLiveProfile()", "GetUiStreamNo(1)"};
    const RequestRow rows[] = {
        {"another method", [](auto& p) { p.method = "Stop"; }, 0, {"GetAPIMethod()"}},
        {"not admitted", [](auto& p) { p.is_authorized = false; }, 105, {}},
        {"no camera", [](auto& p) { p.params.clear(); }, 401, kDispatch},
        {"negative camera", [](auto& p) { p.params["camera"] = -1; }, 401, kDispatch},
        {"snapshot before item type",
         [](auto& p) { p.params["snapshot"] = p.params["itemType"] = 1, p.cameras.clear(); }, 400,
         kDispatch + Calls{"Load(5,0,0)", "log Failed to load camera [5].\n"}},
        {"e-map", [](auto& p) { p.params["itemType"] = 1, p.has_emap = false; }, 400,
         kItem + Calls{"GetLoginUID()", "IsCmsHost()", "Emap::Load(5)", "log Cannot load emap id = 5.\n"}},
        {"other item type", [](auto& p) { p.params["itemType"] = 2; }, 0, kItem},
        {"unknown camera", [](auto& p) { p.cameras.clear(); }, 400,
         kCamera + Calls{"log Failed to load camera [5].\n"}},
        {"another codec", [](auto& p) { p.cameras[5].m_VideoType = CAM_VIDEO_H264, p.has_stream = false; }, 400,
         own_profile + kStream + Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"no stream", [](auto& p) { p.has_stream = false, p.params["snapshot"] = 2; }, 400,
         own_profile + kStream + Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"a given profile", [](auto& p) { p.has_stream = false, p.params["profileType"] = 0; }, 400,
         kCamera + Calls{"GetUiStreamNo(0)", "StartLive(5,50)", "LiveStreamFifoAt(5,50)",
                         "log Cam[5]: Failed to attach live stream [50].\n"}},
        {"level-4 line", [](auto& p) { p.has_stream = false, p.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 4; }, 400,
         own_profile + Calls{"log Cam[5]: Start live from profileType[1] stmId[51].\n"} + kStream +
             Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"signals that cannot be caught",
         [](auto& p) {
             p.params["itemType"] = 2, p.failing_signals.insert({SIGINT, SIGPIPE});
         },
         0,
         kDispatch + Calls{kSignals[0], "log Fail to set sigaction [SIGINT].\n", kSignals[1], kSignals[2], kSignals[3],
                           "log Fail to set sigaction [SIGPIPE].\n", "GetParam(itemType,0)"}},
        {"plugin", [](auto& p) { p.params["isFromPlugin"] = 1; }, 0,
         own_profile + kStream + Calls{"StartRead()", "Write(image/jpeg,null,0,null)", "fflush()"} + kLastPass +
             kClose},
        {"isFromPlugin 2", [](auto& p) { p.params["isFromPlugin"] = 2; }, 0,
         own_profile + kStream + kStart + kLastPass + kClose},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        LiveView test;
        row.script(test.platform);
        ProbeHandler handler(test.platform);
        handler.HandleProcess();
        EXPECT_EQ(test.platform.CallsFrom("GetAPIMethod"), row.calls);
        EXPECT_EQ(handler.m_ErrCode, row.error);
        EXPECT_EQ(gblStop, 0);
    }
}

TEST(LiveViewRequest, SignalsSetTheStopFlag) {
    for (const int signal : {SIGINT, SIGQUIT, SIGTERM, SIGPIPE}) {
        LiveView test;
        ProbeHandler(test.platform).SetupSignalHandler();
        std::raise(signal);
        EXPECT_EQ(gblStop, 1) << signal;
    }
}

struct LoopRow {
    const char* name;
    Script before;
    const char* at;  // the call at which then happens, each time
    Script then;
    Calls calls;  // from StartRead on
};

Calls Read(int last_seq) {
    return {"UpdateStamp()", "ReadLatest(" + std::to_string(last_seq) + ")"};
}
Calls Write(const std::string& data) {
    return {"Write(image/jpeg," + data + "," + std::to_string(data.size()) + ",null)", "fflush()"};
}
const Calls kDone = {"ReadFinish(entry,1,position)", "usleep(10000)"};
Calls Empty(int last_seq) {
    return Read(last_seq) + Calls{"ReadFinish(null,1,position)", "usleep(10000)"};
}
Calls TimeOut(int last_seq) {
    return Read(last_seq) + Calls{"ReadFinish(null,1,position)", "log Timeeout [Cam: 5]\n"};
}
Calls Exit(const std::string& eof, const std::string& error, const std::string& stop) {
    return Calls{"log Exit loop [Cam: 5, feof: " + eof + ", ferror: " + error + ", gblStop: " + stop + "]\n"} + kClose;
}
Calls Sleeps(std::size_t count) {
    return Calls(count, "sleep(10)");
}

void Leave(ScriptedPlatform&) {}
void Stop(ScriptedPlatform&) {
    gblStop = 1;
}
void Pause(ScriptedPlatform& p) {
    p.common_cfg.m_blPause = 1;
}
void LoseService(ScriptedPlatform& p) {
    p.has_common_cfg = false;
}
void NoPictures(ScriptedPlatform& p) {
    p.frames.resize(9);
}

const LoopRow kLoop[] = {
    {"newest picture behind its offset, then nothing newer",
     [](auto& p) {
         p.frames = {{{7, "xxAB", 2}}, {}, {{0, "C"}}};
     },
     "", Leave,
     Read(10001) + Write("AB") + kDone + Empty(7) + Read(7) + Write("C") + kDone + Empty(0) + Exit("1", "0", "0")},
    {"stopped", Stop, "", Leave, Exit("0", "0", "1")},
    {"broken output", [](auto& p) { p.is_error = true; }, "", Leave, Exit("0", "1", "0")},
    {"stopped while sending",
     [](auto& p) {
         p.frames = {{{1, "A"}}, {{2, "B"}}};
     },
     "fflush()", Stop, Read(10001) + Write("A") + kDone + Exit("0", "0", "1")},
    {"paused, then on", Pause, "sleep(10)", [](auto& p) { p.common_cfg.m_blPause = 0; },
     Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"no service, then on", LoseService, "sleep(10)", [](auto& p) { p.has_common_cfg = p.now >= 1000020; },
     Sleeps(2) + Empty(10001) + Exit("1", "0", "0")},
    {"client gone while paused", Pause, "sleep(10)", [](auto& p) { p.is_eof = true; }, Sleeps(1) + Exit("1", "0", "0")},
    {"output broken while paused", LoseService, "sleep(10)", [](auto& p) { p.is_error = true; },
     Sleeps(1) + Exit("0", "1", "0")},
    {"stopped while paused", LoseService, "sleep(10)", Stop, Sleeps(1) + Exit("0", "0", "1")},
    {"a day old", [](auto& p) { p.common_cfg.m_Timestamp -= 86400; }, "", Leave, Empty(10001) + Exit("1", "0", "0")},
    {"older, until refreshed", [](auto& p) { p.common_cfg.m_Timestamp -= 86401; }, "sleep(10)",
     [](auto& p) { p.common_cfg.m_Timestamp = p.now; }, Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"a day ahead in ten seconds", [](auto& p) { p.common_cfg.m_Timestamp += 86401; }, "", Leave,
     Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"nonsense for a time", [](auto& p) { p.common_cfg.m_Timestamp = INT64_MIN; }, "sleep(10)", Stop,
     Sleeps(1) + Exit("0", "0", "1")},
    {"time-out after a pause", Pause, "sleep(10)", [](auto& p) { p.common_cfg.m_blPause = p.now < 1000030; },
     Sleeps(3) + TimeOut(10001) + Exit("1", "0", "0")},
    {"exactly twenty seconds are no time-out", NoPictures, "usleep(10000)", [](auto& p) { p.now += 20; },
     Empty(10001) + Empty(10001) + TimeOut(10001) + Exit("0", "0", "0")},
    {"a failing flush still counts as a write",
     [](auto& p) {
         NoPictures(p), p.frames[1] = {3, "A"}, p.flush_fails = true;
     },
     "usleep(10000)", [](auto& p) { p.now += 15; },
     Empty(10001) + Read(10001) + Write("A") + Calls{"log Failed to fflush data [Cam: 5, errno: 32]\n"} + kDone +
         Empty(3) + TimeOut(3) + Exit("0", "0", "0")},
};

TEST(LiveViewLoop, RunsAndEndsInOrder) {
    for (const auto& row : kLoop) {
        SCOPED_TRACE(row.name);
        LiveView test;
        test.platform.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 5;
        row.before(test.platform);
        test.platform.on_call = [&](const std::string& call) {
            if (call == row.at) {
                row.then(test.platform);
            }
        };
        ProbeHandler(test.platform).LiveviewMjpgCam(5, 51, false);
        EXPECT_EQ(test.platform.CallsFrom("StartRead"), kStart + row.calls);
        for (const auto& log : test.platform.logs) {
            EXPECT_EQ(log.file + " " + log.func, "liveview_src LiveviewMjpgCam");
        }
    }
}

TEST(LiveViewLoop, TracesEachPictureAtTheHighestLevel) {
    LiveView test;
    auto& platform = test.platform;
    platform.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 6;
    platform.frames = {ScriptedFrame{}};
    ProbeHandler(platform).LiveviewMjpgCam(5, 51, false);
    ASSERT_EQ(platform.logs.size(), 2U);
    EXPECT_EQ(platform.logs[0].level + " " + platform.logs[0].text, "debug Write frame [Cam: 5]\n");
    EXPECT_EQ(platform.logs[1].level, "info");
}

TEST(LiveViewLoop, SkipsSizesOutOfRangeWithoutTakingTheirNumber) {
    struct Row {
        int length, offset;
        bool sent;
    };
    for (const Row& row : {Row{0, 0, false}, Row{9, 9, false}, Row{1, 0, true}, Row{4, 5, false},
                           Row{4194303 + 44, 44, true}, Row{4194304, 0, false}, Row{4, INT32_MIN, false}}) {
        SCOPED_TRACE(testing::Message() << row.length << " - " << row.offset);
        LiveView test;
        test.platform.frames = {ScriptedFrame{8, "", row.offset, row.length}, {}};
        ProbeHandler(test.platform).LiveviewMjpgCam(5, 51, false);
        EXPECT_EQ(test.platform.CallsFrom("Write").empty(), !row.sent);
        EXPECT_EQ(test.platform.CallsFrom("usleep").at(2), row.sent ? "ReadLatest(8)" : "ReadLatest(10001)");
        EXPECT_THAT(test.platform.calls, testing::Contains("ReadFinish(entry,1,position)"));
    }
}

TEST(LiveViewLoop, RecoversTheLockOfADeadOwner) {
    LiveView test;
    auto& platform = test.platform;
    std::thread([&] { pthread_mutex_lock(&platform.common_cfg.m_Mutex); }).join();
    ProbeHandler(platform).LiveviewMjpgCam(5, 51, false);
    EXPECT_EQ(platform.CallsFrom("StartRead"), kStart + kLastPass + kClose);
    EXPECT_EQ(pthread_mutex_lock(&platform.common_cfg.m_Mutex), 0) << "consistent again";
    pthread_mutex_unlock(&platform.common_cfg.m_Mutex);
}

TEST(LiveViewLoop, SelfDeadlockThrowsAndLeavesTheSegment) {
    LiveView test;
    auto& platform = test.platform;
    pthread_mutex_lock(&platform.common_cfg.m_Mutex);
    try {
        ProbeHandler(platform).LiveviewMjpgCam(5, 51, false);
        ADD_FAILURE() << "no exception";
    } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), "Potential self-deadlock detected!");
    }
    EXPECT_EQ(platform.CallsFrom("StartRead"), kStart);
    pthread_mutex_unlock(&platform.common_cfg.m_Mutex);
}

struct SnapshotRow {
    const char* name;
    Script script;
    int error;
    Calls calls;
    std::string output;
};

TEST(LiveViewSnapshot, WritesOnePictureOrNothing) {
    const Calls attach = {"Load(5,0,0)", "GetLiveProfile()", "GetUiStreamNo(1)", "LiveStreamFifoAt(5,51)"};
    const Calls sent =
        attach + Calls{"ReadLatest(-1)", "fflush()", "ReadFinish(entry,0,null)", "shmdt()", "SetEnableOutput(0)"};
    const auto head = [](int size) {
        return "Content-type: image/jpeg\r\nContent-length: " + std::to_string(size) + "\r\n\r\n";
    };
    const SnapshotRow rows[] = {
        {"picture behind its offset",
         [](auto& p) {
             p.frames = {ScriptedFrame{1, "xxx\xff\xd8\n", 3}};
         },
         0, sent, head(3) + "\xff\xd8\n"},
        {"empty picture",
         [](auto& p) {
             p.frames = {ScriptedFrame{1, "xxx", 3}};
         },
         0, sent, head(0)},
        {"unknown camera",
         [](auto& p) { p.cameras.clear(); },
         400,
         {"Load(5,0,0)", "log Failed to load camera [5].\n"},
         ""},
        {"another codec",
         [](auto& p) { p.cameras[5].m_VideoType = CAM_VIDEO_H264; },
         400,
         {"Load(5,0,0)", "log The video codec of cam[5] NOT mjpg.\n"},
         ""},
        {"no stream", [](auto& p) { p.has_stream = false; }, 400,
         attach + Calls{"log Failed to attach cam[5] live stream buf\n"}, ""},
        {"empty stream", [](auto&) {}, 400, attach + Calls{"ReadLatest(-1)"}, ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        LiveView test;
        row.script(test.platform);
        ProbeHandler handler(test.platform);
        StdoutCapture capture;
        test.platform.calls.clear();
        handler.SnapshotMjpgCam(5);
        const Calls calls = test.platform.calls;  // before the capture's own flush
        EXPECT_EQ(capture.Text(), row.output);
        EXPECT_EQ(calls, row.calls);
        EXPECT_EQ(handler.m_ErrCode, row.error);
    }
}

}  // namespace
