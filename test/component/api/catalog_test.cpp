// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Catalog: states of cameras, groups, mounts and rights, as far as the caller may see them.
#include "standalone/control/common_config.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "test/component/api/event_fixture.h"

namespace lookhaven::api {
namespace {

class CatalogApi : public EventApi {};

TEST_F(CatalogApi, TellsWhichCamerasAreDownToThoseWhoMayWatchThem) {
    const std::string ask = "Catalog&version=1&method=CameraStates";
    maintenance::CameraStatus down{.camera = 1, .state = maintenance::RecordingState::kNoSignal};
    down.lost_since_s = 1'772'352'930;
    down.loss = base::SignalLoss::kRefused;
    down.loss_reason = "cannot open rtsp://192.0.2.1/";
    maintenance::CameraStatus denied = down;
    denied.camera = 2;
    maintenance::WriteCameraStatus(host_.Home(), {down, denied, {.camera = 3}});
    EXPECT_EQ(Ask(ask).Json()["data"]["recorder"], false) << "stale";
    EXPECT_TRUE(Ask(ask).Json()["data"]["camera"].empty());
    control::CommonConfigKeeper(host_.Home()).Refresh(false);
    const Json::Value all = Ask(ask).Json()["data"]["camera"];
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[0]["state"], "no-signal");
    EXPECT_EQ(all[1]["no_signal"]["reason"], "cannot open rtsp://192.0.2.1/");
    EXPECT_FALSE(all[2].isMember("no_signal"));
    const Json::Value seen = Ask(ask, "", true).Json()["data"]["camera"];
    ASSERT_EQ(seen.size(), 2U);
    EXPECT_EQ(seen[0]["no_signal"]["cause"], "refused");
    EXPECT_FALSE(seen[0]["no_signal"].isMember("reason")) << "an address of the cameras' network";
}

TEST_F(CatalogApi, ListsGroupsAndMountsThatTheCallerMaySee) {
    store::Groups groups(footage_.Records());
    groups.Add({0, "Front", {1, 2}});
    const int yard = groups.Add({0, "Yard", {3}});
    store::Users(footage_.Records()).DenyGroup(2, yard);
    viewer_ = host_.LogIn("guest").secret;
    store::Mounts(footage_.Records()).Add({.name = "Empty", .path = "/nowhere"});
    const auto listed = [&](const char* method, const char* key, bool as_viewer, const char* cameras = "camera") {
        std::string text;
        const Json::Value answer = Ask(std::string("Catalog&version=1&method=") + method, "", as_viewer).Json();
        for (const Json::Value& each : answer["data"][key]) {
            text += each["name"].asString() + ':';
            for (const Json::Value& camera : each[cameras]) {
                text += camera.asString() + ' ';
            }
        }
        return text;
    };
    EXPECT_EQ(listed("Groups", "group", false), "Front:1 2 Yard:3 ");
    EXPECT_EQ(listed("Groups", "group", true), "Front:1 ");
    EXPECT_EQ(listed("Groups", "group", true, "live"), "Front:1 ");
    EXPECT_EQ(listed("Mounts", "mount", false), "Disk:1 2 3 Empty:");
    EXPECT_EQ(listed("Mounts", "mount", true), "Disk:1 ");
    store::Users(footage_.Records()).Deny(2, 1, {store::CameraAccess::kPlayback});
    viewer_ = host_.LogIn("guest").secret;
    EXPECT_EQ(listed("Groups", "group", true), "Front:");
    EXPECT_EQ(listed("Groups", "group", true, "live"), "Front:1 ") << "may be watched";
}

TEST_F(CatalogApi, TellsWhatTheCallerMayDoWithTheCamerasThatHeMaySee) {
    store::Users(footage_.Records()).Deny(2, 1, {store::CameraAccess::kExport});
    store::Users(footage_.Records()).Deny(2, 3, {store::CameraAccess::kAudio});
    viewer_ = host_.LogIn("guest").secret;
    const auto told = [&](bool as_viewer) {
        std::string text;
        const Json::Value answer = Ask("Catalog&version=1&method=Rights", "", as_viewer).Json();
        for (const Json::Value& camera : answer["data"]["camera"]) {
            text += camera["id"].asString();
            for (const char* right : {"live", "audio", "playback", "export"}) {
                text += camera[right].asBool() ? std::string(" ") + right : "";
            }
            text += ';';
        }
        return text;
    };
    const std::string all = " live audio playback export;";
    EXPECT_EQ(told(false), "1" + all + "2" + all + "3" + all);
    EXPECT_EQ(told(true), "1 live audio playback;3 live;") << "2 is denied, and nobody exports what they may not play";
}

}  // namespace
}  // namespace lookhaven::api
