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

std::string Listed(int id, int video_type, int sound) {
    const std::string number = std::to_string(id);
    return "{\"cam_ptz\":" + std::to_string(0x80000000U + static_cast<unsigned int>(id)) + ",\"id\":" + number +
           ",\"liveview_port\":5000,\"name\":\"cam" + number + "\",\"sound_support\":" + std::to_string(sound) +
           ",\"video_type\":" + std::to_string(video_type) + "}";
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
    const char* answer;  // without the cameras
    std::string cameras = Listed(4, 1, 1);
};

TEST(LoadCamera, Answers) {
    const AnswerRow rows[] = {
        {"first MJPEG camera", Nothing, R"("ShowAll":1,#"isManager":false,"selected":4)"},
        {"a camera that is not listed", Params({{"camera", 5}}), R"("ShowAll":0,#"isManager":false,"selected":5)"},
        {"camera 1", Params({{"camera", 1}}), R"("ShowAll":0,#"isManager":false,"selected":1)"},
        {"negative camera", Params({{"camera", -3}}), R"("ShowAll":1,#"isManager":false,"selected":-3)"},
        {"privilege 0", [](auto& p) { p.privilege = 0; }, R"("ShowAll":1,#"isManager":true,"selected":4)"},
        {"privilege 1", [](auto& p) { p.privilege = 1; }, R"("ShowAll":1,#"isManager":true,"selected":4)"},
        {"no sound", [](auto& p) { p.sound[4] = Sound::kNo; }, R"("ShowAll":1,#"isManager":false,"selected":4)",
         Listed(4, 1, 0)},
        {"no MJPEG", [](auto& p) { p.camera_list.back() = MakeCamera(2, CAM_VIDEO_H264); },
         R"("ShowAll":1,#"isManager":false,"selected":-1)", Listed(2, 3, 1)},
        {"all disabled", [](auto& p) { p.camera_list.back().m_blEnabled = false; },
         R"("ShowAll":1,#"isManager":false,"selected":-1)", ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        Load(platform, [&](auto& p) {
            p.camera_list = {MakeCamera(3, 1, false), MakeCamera(4, CAM_VIDEO_MJPEG)};
            row.script(p);
        });
        std::string answer = row.answer;
        answer.replace(answer.find('#'), 1, row.cameras.empty() ? "" : "\"camera\":[" + row.cameras + "],");
        EXPECT_EQ(platform.calls.back(), "SetSuccess({\"CamNum\":2,\"EnableCamNum\":" +
                                             std::string(row.cameras.empty() ? "0," : "1,") + answer + "})");
        EXPECT_THAT(platform.logs, IsEmpty());
    }
}

struct FailureRow {
    const char* name;
    Change script;
    std::string logs;  // source:line function: text, of each
    bool answered;
};

TEST(LoadCamera, FailuresAreLoggedAndOnlyABrokenFunctorIsForgiven) {
    const std::string failed = "liveview:96 HandleLiveviewLoad: Failed to sent camera data.\n";
    const std::string functor = "interface/handlerutils:";
    const std::string no_port = "liveview:36 SendCamerasData: Failed to get direct login port.\n";
    const std::string not_registered =
        functor +
        "544 operator(): [Sound] Error: Some Functor is not registered properly. Check the template argument list and "
        "Function ID.\n";
    const FailureRow rows[] = {
        {"unknown user, and no port", [](auto& p) { p.profile_id = p.login_port = 0; },
         "liveview:24 SendCamerasData: Incorrect priv profile of Uid[7].\n" + failed, false},
        {"no port, nor capabilities", [](auto& p) { p.login_port = 0, p.cap_failures = {2}; }, no_port + failed, false},
        {"negative port", [](auto& p) { p.login_port = -1; }, no_port + failed, false},
        {"capability of one camera", [](auto& p) { p.cap_failures = {4}; },
         "liveview:57 SendCamerasData: Failed to get camera cap.\n" + failed, false},
        {"capability of a disabled camera", [](auto& p) { p.cap_failures = {3}; }, "", true},
        {"functor without target", [](auto& p) { p.sound[4] = Sound::kNoTarget; },
         functor + "541 operator(): [Sound] Error: Failed to run functor with DPObjectBase as NULL.\n", true},
        {"no functor", [](auto& p) { p.sound[4] = Sound::kNoFunctor; }, not_registered, true},
        {"functor of another type", [](auto& p) { p.sound[4] = Sound::kWrongType; }, not_registered, true},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        Load(platform, row.script);
        std::string logs;
        for (const auto& log : platform.logs) {
            EXPECT_EQ(log.categ + log.level, "nullnull");
            logs += log.file + ":" + std::to_string(log.line) + " " + log.func + ": " + log.text;
        }
        EXPECT_EQ(logs, row.logs);
        EXPECT_EQ(platform.CallsFrom("Set").size(), row.answered ? 1U : 0U);
        if (row.answered && !row.logs.empty()) {
            EXPECT_THAT(platform.calls.back(), testing::HasSubstr(Listed(4, 1, 0)));
        }
    }
}

}  // namespace
