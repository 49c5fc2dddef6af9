// SPDX-License-Identifier: Apache-2.0
//
// Players under the host: the rate, position and pause of VEXO.Playback, and who may reach whom.
#include <chrono>
#include <thread>

#include "test/component/api/playback_fixture.h"

namespace lookhaven::api {
namespace {

using namespace std::chrono_literals;

TEST_F(Playback, ObeysWhatThePlayersModeCan) {
    const struct {
        const char* player;
        int set_rate, get_position, pause;  // the statuses
    } cases[] = {
        {"PlayMjpegEvent&timestamp=7", 200, 409, 409},
        {"PlayMjpegEvent&timestamp=7&interval=5", 409, 409, 409},
        {"PlayMjpegEvent&timestamp=7&changerate=0", 200, 409, 409},
        {"PlayMjpegEventNoFrameId&timestamp=7", 409, 200, 200},
        {"PlayMjpegEventNoFrameId&timestamp=7&playrate=4", 409, 200, 409},
        {"PlayMjpegEventNoFrameId&timestamp=7&playrate=-4", 409, 200, 200},
        {"PlayMjpegEventNoFrameId&timestamp=7&changerate=1", 200, 409, 200},
        {"PlayMjpegEventNoFrameId&timestamp=7&changerate=1&playrate=4", 200, 409, 200},
        {"PlayMjpegEventNoFrameId&timestamp=7&changerate=1&interval=0", 409, 409, 409},
    };
    for (const auto& each : cases) {
        Player player = Play(each.player);
        EXPECT_EQ(Ask("SetRate", "timestamp=7&rate=2").status, each.set_rate) << each.player;
        EXPECT_EQ(Ask("GetPosition", "timestamp=7").status, each.get_position) << each.player;
        EXPECT_EQ(Ask("Pause", "timestamp=7&on=true").status, each.pause) << each.player;
        EXPECT_EQ(Ask("CheckOwner", "timestamp=7").Json()["data"]["owner"], true) << each.player;
        EXPECT_EQ(player.Tell("checks"), 0) << "nobody else owns its file";
        EXPECT_EQ(Ask("Stop", "timestamp=7").status, 200);
        EXPECT_TRUE(Eventually(2s, [&] { return player.HasEnded(); })) << each.player;
        EXPECT_TRUE(Eventually(2s, [&] { return Ask("Stop", "timestamp=7").status == 404; })) << each.player;
    }
}

TEST_F(Playback, RefusesBadInput) {
    Player player = Play("PlayMjpegEventNoFrameId&changerate=1&timestamp=7");
    const struct {
        const char* method;
        const char* form;
        int status;
    } cases[] = {
        {"SetRate", "timestamp=7&rate=0", 400},
        {"SetRate", "timestamp=7&rate=-1", 400},
        {"SetRate", "timestamp=7&rate=-9", 400},
        {"SetRate", "timestamp=7&rate=17", 400},
        {"SetRate", "timestamp=7", 400},
        {"SetRate", "timestamp=7&rate=fast", 400},
        {"SetRate", "timestamp=7&rate=2.5", 400},
        {"SetRate", "timestamp=7&rate=99999999999", 400},
        {"SetRate", "timestamp=8&rate=2", 404},
        {"SetRate", "timestamp=0&rate=2", 400},
        {"SetRate", "rate=2", 400},
        {"SetRate", "timestamp=x&rate=2", 400},
        {"Pause", "timestamp=7", 400},
        {"Pause", "timestamp=7&on=1", 400},
        {"Pause", "timestamp=7&on=yes", 400},
        {"Rewind", "timestamp=7", 404},
        {"Stop", "timestamp=-7", 400},
    };
    for (const auto& each : cases) {
        EXPECT_EQ(Ask(each.method, each.form).status, each.status) << each.method << ' ' << each.form;
    }
    for (const char* method : {"SetRate&rate=2", "Pause&on=true", "CheckOwner", "Stop"}) {
        EXPECT_EQ(
            host_.Ask("api=VEXO.Playback&version=1&timestamp=7&method=" + std::string(method), session_.secret).status,
            405)
            << method << " changes something";
    }
    EXPECT_EQ(player.Tell("rate"), 1);
    EXPECT_EQ(player.Tell("paused"), 0);
}

TEST_F(Playback, IsForPlayersOfTheOwnSession) {
    Player player = Play("PlayMjpegEventNoFrameId&changerate=1&timestamp=7");
    for (const char* account : {"admin", "guest"}) {
        const std::string other = host_.LogIn(account).secret;
        for (const auto& [method, form] : {std::pair{"SetRate", "timestamp=7&rate=2"},
                                           {"Pause", "timestamp=7&on=true"},
                                           {"CheckOwner", "timestamp=7"},
                                           {"Stop", "timestamp=7"}}) {
            EXPECT_EQ(Ask(method, form, other).status, 404) << account << ' ' << method;
        }
        // Its own player under the same key is another one.
        Player own(host_, other, "PlayMjpegEventNoFrameId&timestamp=7");
        EXPECT_TRUE(own.Tell("rate")) << "ends when its number is not its own";
        EXPECT_EQ(Ask("GetPosition", "timestamp=7", other).status, 200);
    }
    EXPECT_EQ(player.Tell("rate"), 1);
    EXPECT_EQ(player.Tell("paused"), 0);
}

TEST_F(Playback, StandsStillWhilePausedAndResumesItsRate) {
    Player player = Play("PlayMjpegEventNoFrameId&changerate=1&playrate=4&timestamp=7");
    EXPECT_EQ(Ask("Pause", "timestamp=7&on=true").status, 200);
    ASSERT_TRUE(Eventually(2s, [&] { return player.Tell("rate") == 1; })) << "a faster one would not stand still";
    const auto stands_at = player.Tell("sum");
    EXPECT_EQ(Ask("Pause", "timestamp=7&on=true").status, 200);
    EXPECT_EQ(player.Tell("paused"), 1) << "told once only: twice would resume it";
    EXPECT_EQ(Ask("SetRate", "timestamp=7&rate=8").status, 200);
    EXPECT_EQ(player.Tell("rate"), 1) << "the new rate waits for the end of the pause";
    EXPECT_EQ(player.Tell("sum"), stands_at);
    EXPECT_EQ(Ask("Pause", "timestamp=7&on=false").status, 200);
    EXPECT_TRUE(Eventually(2s, [&] { return player.Tell("rate") == 8; }));
    EXPECT_EQ(player.Tell("paused"), 0);
    EXPECT_EQ(Ask("Pause", "timestamp=7&on=false").status, 200);
    EXPECT_EQ(player.Tell("paused"), 0);
    // However fast they follow each other, no change is lost.
    for (int i = 0; i < 50; ++i) {
        EXPECT_EQ(Ask("Pause", std::string("timestamp=7&on=") + (i % 2 == 0 ? "true" : "false")).status, 200);
    }
    EXPECT_EQ(player.Tell("paused"), 0);
}

TEST_F(Playback, WaitsForAPlayerThatIsStillOpening) {
    const std::string play = "PlayMjpegEventNoFrameId&changerate=1&playrate=4&timestamp=7&opens=";
    Player older = Play(play + "0");  // a seek: the key is taken over
    older.Close();
    Player player(host_, session_.secret, play + "300");
    ASSERT_TRUE(Eventually(2s, [&] { return Ask("Pause", "timestamp=7&on=true").status != 404; }));
    EXPECT_TRUE(Eventually(2s, [&] { return player.Tell("rate") == 1; }));
    EXPECT_EQ(player.Tell("paused"), 1);
    const Player slow(host_, session_.secret, "PlayMjpegEvent&timestamp=8&opens=3000");
    ASSERT_TRUE(Eventually(2s, [&] { return Ask("SetRate", "timestamp=8&rate=2").status == 409; }));
}

TEST_F(Playback, StandsStillWhilePausedWhoeverSetsTheRateMeanwhile) {
    Player player = Play("PlayMjpegEventNoFrameId&changerate=1&playrate=4&timestamp=7");
    for (int round = 0; round < 20; ++round) {
        std::thread other([this] { EXPECT_EQ(Ask("SetRate", "timestamp=7&rate=8").status, 200); });
        EXPECT_EQ(Ask("Pause", "timestamp=7&on=true").status, 200);
        other.join();
        EXPECT_TRUE(Eventually(1s, [&] { return player.Tell("rate") == 1; })) << round;
        EXPECT_EQ(Ask("Pause", "timestamp=7&on=false").status, 200);
        EXPECT_TRUE(Eventually(1s, [&] { return player.Tell("rate") == 8; })) << round;
    }
}

}  // namespace
}  // namespace lookhaven::api
