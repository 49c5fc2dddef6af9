// SPDX-License-Identifier: Apache-2.0
//
// Live view: what a request gets, and what a snapshot writes.
#include <gtest/gtest.h>

#include "test/unit/scripted_live.h"

using namespace lookhaven::test;

namespace {

const int kStopAtLoad = gblStop;

const Calls kSignals = {"sigaction(2,0,no mask)", "sigaction(3,0,no mask)", "sigaction(15,0,no mask)",
                        "sigaction(13,0,no mask)"};
const Calls kDispatch = {"GetAPIMethod()", "GetParam(camera,0)", "GetParam(snapshot,0)"};
const Calls kItem = kDispatch + kSignals + Calls{"GetParam(itemType,0)"};
const Calls kCamera = kItem + Calls{"GetParam(isFromPlugin,0)", "GetParam(profileType,-1)", "Load(5,0,0)"};
const Calls kStream = {"StartLive(5,51)", "LiveStreamFifoAt(5,51)"};
const Calls kSnapshot = kDispatch + Calls{"Load(5,0,0)"};
const Calls kAttach = kSnapshot + Calls{"GetLiveProfile()", "GetUiStreamNo(1)", "LiveStreamFifoAt(5,51)"};
const Calls kSent =
    kAttach + Calls{"ReadLatest()", "fflush()", "ReadFinish(entry,0,null)", "shmdt()", "SetEnableOutput(0)"};

struct RequestRow {
    const char* name;
    Change script;
    int error;
    Calls calls;
    std::string output = "";  // written directly, not through the platform
};

TEST(LiveViewRequest, ReadsInOrderAndPicksTheOutput) {
    const Change snapshot = Params({{"snapshot", 1}});
    const std::string head = "Content-type: image/jpeg\r\nContent-length: ";
    const Calls own_profile = kCamera + Calls{"GetLiveProfile()", "GetUiStreamNo(1)"};
    const Calls no_sound = own_profile + kStream +
                           Calls{"LiveAdoStreamFifoAt(5,51)", "log Cam[5]: Failed to attach live audio stream [51].\n"};
    const Calls not_mjpeg = kSnapshot + Calls{"log The video codec of cam[5] NOT mjpg.\n"};
    const RequestRow rows[] = {
        {"another method", [](auto& p) { p.method = "Stop"; }, 0, {"GetAPIMethod()"}},
        {"not admitted, nor a camera", [](auto& p) { p.is_authorized = false, p.params.clear(); }, 105, {}},
        {"no camera", [](auto& p) { p.params.clear(); }, 401, kDispatch},
        {"negative camera", [](auto& p) { p.params["camera"] = -1; }, 401, kDispatch},
        {"snapshot before item type",
         [](auto& p) { p.params["snapshot"] = p.params["itemType"] = 1, p.cameras.clear(); }, 400,
         kSnapshot + Calls{"log Failed to load camera [5].\n"}},
        {"e-map", [](auto& p) { p.params["itemType"] = 1, p.has_emap = false; }, 400,
         kItem + Calls{"GetLoginUID()", "IsCmsHost()", "Emap::Load(5)", "log Cannot load emap id = 5.\n"}},
        {"other item type", [](auto& p) { p.params["itemType"] = 2; }, 0, kItem},
        {"unknown camera", [](auto& p) { p.cameras.clear(); }, 400,
         kCamera + Calls{"log Failed to load camera [5].\n"}},
        {"camera 1", [](auto& p) { p.params["camera"] = p.params["snapshot"] = 1; }, 400,
         kDispatch + Calls{"Load(1,0,0)", "log Failed to load camera [1].\n"}},
        {"another codec, no stream",
         [](auto& p) { p.cameras[5].m_VideoType = CAM_VIDEO_H264, p.has_stream = p.has_audio_stream = false; }, 400,
         own_profile + kStream + Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"another codec", [](auto& p) { p.cameras[5].m_VideoType = CAM_VIDEO_H264, p.has_audio_stream = false; }, 400,
         no_sound},
        {"unknown codec", [](auto& p) { p.cameras[5].m_VideoType = 0, p.has_audio_stream = false; }, 400, no_sound},
        {"no stream", [](auto& p) { p.has_stream = false, p.params["snapshot"] = 2; }, 400,
         own_profile + kStream + Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"a given profile", [](auto& p) { p.has_stream = false, p.params["profileType"] = 0; }, 400,
         kCamera + Calls{"GetUiStreamNo(0)", "StartLive(5,50)", "LiveStreamFifoAt(5,50)",
                         "log Cam[5]: Failed to attach live stream [50].\n"}},
        {"level-4 line", [](auto& p) { p.has_stream = false, p.log_cfg.m_CategLevel[32] = 4; }, 400,
         own_profile + Calls{"log live/4 Cam[5]: Start live from profileType[1] stmId[51].\n"} + kStream +
             Calls{"log Cam[5]: Failed to attach live stream [51].\n"}},
        {"signals that cannot be caught",
         [](auto& p) {
             p.params["itemType"] = 2, p.failing_signals.insert({SIGINT, SIGPIPE});
         },
         0,
         kDispatch + Calls{kSignals[0], "log Fail to set sigaction [SIGINT].\n", kSignals[1], kSignals[2], kSignals[3],
                           "log Fail to set sigaction [SIGPIPE].\n", "GetParam(itemType,0)"}},
        {"plugin", [](auto& p) { p.params["isFromPlugin"] = 1; }, 0,
         own_profile + kStream + kStart + Calls{"Write(image/jpeg,null,0,null)", "fflush()"} + Empty(10001) + kClose},
        {"isFromPlugin 2", [](auto& p) { p.params["isFromPlugin"] = 2; }, 0,
         own_profile + kStream + kStart + Empty(10001) + kClose},
        {"snapshot of another codec, nor a stream",
         snapshot + [](auto& p) { p.cameras[5].m_VideoType = CAM_VIDEO_H264, p.has_stream = false; }, 400, not_mjpeg},
        {"snapshot of an unknown codec", snapshot + [](auto& p) { p.cameras[5].m_VideoType = 0; }, 400, not_mjpeg},
        {"snapshot of no stream", snapshot + [](auto& p) { p.has_stream = false; }, 400,
         kAttach + Calls{"log Failed to attach cam[5] live stream buf\n"}},
        {"snapshot of an empty stream", snapshot, 400, kAttach + Calls{"ReadLatest()"}},
        {"snapshot: picture behind its offset", snapshot + Pictures({{{1, "xxx\xff\xd8\n", 3}}}), 0, kSent,
         head + "3\r\n\r\n\xff\xd8\n"},
        {"snapshot: empty picture", snapshot + Pictures({{{1, "xxx", 3}}}), 0, kSent, head + "0\r\n\r\n"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        LiveView test;
        row.script(test);
        LiveHandler handler(test);
        StdoutCapture capture;
        handler.HandleProcess();
        EXPECT_EQ(capture.Text(), row.output);
        EXPECT_EQ(test.CallsFrom("GetAPIMethod"), row.calls);
        EXPECT_EQ(handler.m_ErrCode, row.error);
        EXPECT_EQ(gblStop, 0);
    }
}

TEST(LiveViewRequest, SignalsSetTheStopFlag) {
    EXPECT_EQ(kStopAtLoad, 0);
    for (const int signal : {SIGINT, SIGQUIT, SIGTERM, SIGPIPE}) {
        LiveView test;
        LiveHandler(test).SetupSignalHandler();
        std::raise(signal);
        EXPECT_EQ(gblStop, 1) << signal;
    }
}

}  // namespace
