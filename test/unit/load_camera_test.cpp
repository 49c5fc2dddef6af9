// SPDX-License-Identifier: Apache-2.0
//
// The camera list: which cameras it holds for whom, and what is logged when it fails.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "player/liveview/liveview.h"
#include "test/support/platform/scripted_platform.h"

using namespace lookhaven::test;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

void Load(ScriptedPlatform& platform, const Change& script) {
    platform.method = "LoadCamera";
    platform.camera_list = {MakeCamera(2, CAM_VIDEO_H264), MakeCamera(3, CAM_VIDEO_MJPEG, false),
                            MakeCamera(4, CAM_VIDEO_MJPEG), MakeCamera(6, CAM_VIDEO_MJPEG)};
    script(platform);
    LiveviewHandler(platform.Request(), platform.Response()).HandleProcess();
}

std::string Camera4(const char* sound) {
    return std::string("{\"cam_ptz\":2147483652,\"id\":4,\"liveview_port\":5000,\"name\":\"cam4\",\"sound_support\":") +
           sound + ",\"video_type\":1}";
}

TEST(LoadCamera, AsksInOrderAndOnlyForEnabledCameras) {
    ScriptedPlatform platform;
    Load(platform, [](auto& p) { p.denied_cameras = {7, 3}, p.camera_list.pop_back(); });
    EXPECT_THAT(platform.calls,
                ElementsAre("GetAPIMethod()", "GetParam(camera,0)", "GetLoginUID()", "PrivProfileGetByUid(7)",
                            "GetInaCamIdSet(1,0)", "GetCamLocalList(0,,3,7,0,0)", "GetLoginPort()", "LoadByCam(2)",
                            "GetLoginUserName()", "GetLiveStmPtzCapByUserName(2,eve)", "SoundSupport()", "LoadByCam(4)",
                            "GetLoginUserName()", "GetLiveStmPtzCapByUserName(4,eve)", "SoundSupport()",
                            testing::StartsWith("SetSuccess(")));
}

struct AnswerRow {
    const char* name;
    Change script;
    std::string answer;
};

TEST(LoadCamera, Answers) {
    const auto only4 = [](auto& p) { p.camera_list = {MakeCamera(3, 1, false), MakeCamera(4, CAM_VIDEO_MJPEG)}; };
    const auto tail = [](int selected, const char* show_all, const char* manager) {
        return std::string("],\"isManager\":") + manager + ",\"selected\":" + std::to_string(selected) + "}|" +
               show_all;
    };
    const auto answer = [](const std::string& camera, const std::string& tail_text) {
        const auto bar = tail_text.find('|');
        return "SetSuccess({\"CamNum\":2,\"EnableCamNum\":1,\"ShowAll\":" + tail_text.substr(bar + 1) +
               ",\"camera\":[" + camera + tail_text.substr(0, bar) + ")";
    };
    const AnswerRow rows[] = {
        {"first MJPEG camera", [](auto&) {}, answer(Camera4("1"), tail(4, "1", "false"))},
        {"a camera that is not listed", [](auto& p) { p.params["camera"] = 5; },
         answer(Camera4("1"), tail(5, "0", "false"))},
        {"negative camera", [](auto& p) { p.params["camera"] = -3; }, answer(Camera4("1"), tail(-3, "1", "false"))},
        {"privilege 0", [](auto& p) { p.privilege = 0; }, answer(Camera4("1"), tail(4, "1", "true"))},
        {"privilege 1", [](auto& p) { p.privilege = 1; }, answer(Camera4("1"), tail(4, "1", "true"))},
        {"no sound", [](auto& p) { p.sound[4] = Sound::kNo; }, answer(Camera4("0"), tail(4, "1", "false"))},
        {"all disabled", [](auto& p) { p.camera_list = {MakeCamera(3, 1, false)}; },
         "SetSuccess({\"CamNum\":1,\"EnableCamNum\":0,\"ShowAll\":1,\"isManager\":false,\"selected\":-1})"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        Load(platform, [&](auto& p) { only4(p), row.script(p); });
        EXPECT_EQ(platform.calls.back(), row.answer);
        EXPECT_THAT(platform.logs, IsEmpty());
    }
}

TEST(LoadCamera, SelectsNoneWhenNoneIsMjpeg) {
    ScriptedPlatform platform;
    Load(platform, [](auto& p) { p.camera_list.resize(2); });
    EXPECT_THAT(platform.calls.back(), testing::EndsWith("\"selected\":-1})"));
}

struct FailureRow {
    const char* name;
    Change script;
    std::vector<std::string> logs;  // source:line function: text
    bool answered;
};

TEST(LoadCamera, FailuresAreLoggedAndOnlyABrokenFunctorIsForgiven) {
    const std::string failed = "liveview:96 HandleLiveviewLoad: Failed to sent camera data.\n";
    const std::string functor = "interface/handlerutils:";
    const FailureRow rows[] = {
        {"unknown user, and no port",
         [](auto& p) { p.profile_id = p.login_port = 0; },
         {"liveview:24 SendCamerasData: Incorrect priv profile of Uid[7].\n", failed},
         false},
        {"no port, nor capabilities",
         [](auto& p) { p.login_port = 0, p.cap_failures = {2}; },
         {"liveview:36 SendCamerasData: Failed to get direct login port.\n", failed},
         false},
        {"negative port",
         [](auto& p) { p.login_port = -1; },
         {"liveview:36 SendCamerasData: Failed to get direct login port.\n", failed},
         false},
        {"capability of one camera",
         [](auto& p) { p.cap_failures = {4}; },
         {"liveview:57 SendCamerasData: Failed to get camera cap.\n", failed},
         false},
        {"capability of a disabled camera", [](auto& p) { p.cap_failures = {3}; }, {}, true},
        {"functor without target",
         [](auto& p) { p.sound[4] = Sound::kNoTarget; },
         {functor + "541 operator(): [Sound] Error: Failed to run functor with DPObjectBase as NULL.\n"},
         true},
        {"no functor",
         [](auto& p) { p.sound[4] = Sound::kNoFunctor; },
         {functor + "544 operator(): [Sound] Error: Some Functor is not registered properly. Check the template "
                    "argument list and Function ID.\n"},
         true},
        {"functor of another type",
         [](auto& p) { p.sound[4] = Sound::kWrongType; },
         {functor + "544 operator(): [Sound] Error: Some Functor is not registered properly. Check the template "
                    "argument list and Function ID.\n"},
         true},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        Load(platform, row.script);
        std::vector<std::string> logs;
        for (const auto& log : platform.logs) {
            EXPECT_EQ(log.categ + log.level, "nullnull");
            logs.push_back(log.file + ":" + std::to_string(log.line) + " " + log.func + ": " + log.text);
        }
        EXPECT_EQ(logs, row.logs);
        EXPECT_EQ(platform.CallsFrom("Set").size(), row.answered ? 1U : 0U);
        if (row.answered && !row.logs.empty()) {
            EXPECT_THAT(platform.calls.back(), testing::HasSubstr(Camera4("0")));
        }
    }
}

}  // namespace
