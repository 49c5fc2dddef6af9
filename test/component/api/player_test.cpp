// SPDX-License-Identifier: Apache-2.0
//
// The players of a session: how they follow each other, how many play at once, and what is swept behind them.
#include <charconv>
#include <chrono>
#include <csignal>
#include <fstream>
#include <thread>

#include "standalone/store/settings.h"
#include "test/component/api/playback_fixture.h"

namespace lookhaven::api {
namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

TEST_F(Playback, HandsOverToTheNewerPlayer) {
    Player other(host_, host_.LogIn().secret, "PlayMjpegEvent&timestamp=7");
    ASSERT_TRUE(other.Tell("rate"));
    for (int round = 0; round < 5; ++round) {
        Player older = Play("PlayMjpegEvent&timestamp=1");
        Player newer = Play("PlayMjpegEvent&timestamp=2");
        const auto began = Clock::now();
        EXPECT_TRUE(Eventually(2s, [&] { return older.HasEnded(); }));
        EXPECT_LT(Clock::now() - began, 300ms) << "the host sends it on without anybody's help";
        EXPECT_EQ(newer.Tell("checks"), 0) << "owns its file, so nobody asks";
        ASSERT_TRUE(Eventually(2s, [&] { return host_.RequestProcesses() == 2; }));
        EXPECT_TRUE(std::filesystem::exists(PlayerFile())) << "the older one leaves it to the newer";
        newer.Close();
        ASSERT_TRUE(Eventually(2s, [&] { return host_.RequestProcesses() == 1; }));
        EXPECT_FALSE(std::filesystem::exists(PlayerFile()));
    }
    EXPECT_EQ(other.Tell("checks"), 0) << "another session's players stay out of it";
}

TEST_F(Playback, LeavesAloneWhomNobodyHasReplaced) {
    Player player = Play("PlayMjpegEvent&timestamp=1");
    // A stranger's number, no number, no file: nobody has taken over.
    for (const char* content : {"x", "", "1"}) {
        std::ofstream(PlayerFile()) << content;
        EXPECT_EQ(Ask("CheckOwner", "timestamp=1").Json()["data"]["owner"], true) << content;
        EXPECT_EQ(player.Tell("checks"), 0) << content;
    }
    EXPECT_EQ(host_.Ask("api=Test&version=1&method=Nothing", session_.secret).status, 502);
    ASSERT_TRUE(Eventually(2s, [&] { return host_.RequestProcesses() == 1; }));
    EXPECT_TRUE(std::filesystem::remove(PlayerFile())) << "swept behind a process that did not write it";
    EXPECT_EQ(Ask("CheckOwner", "timestamp=1").status, 200);
    EXPECT_EQ(player.Tell("checks"), 0);
}

TEST_F(Playback, LetsAsManyPlaySideBySideAsTheSettingSays) {
    Allow(3);
    std::vector<Player> players;
    for (int key = 1; key <= 5; ++key) {
        players.push_back(Play("PlayMjpegEvent&timestamp=" + std::to_string(key)));
        EXPECT_TRUE(
            Eventually(2s, [&] { return host_.RequestProcesses() == std::min<std::size_t>(players.size(), 3); }));
    }
    EXPECT_TRUE(Eventually(2s, [&] { return players[0].HasEnded() && players[1].HasEnded(); })) << "the oldest go";
    for (int key = 3; key <= 5; ++key) {
        EXPECT_EQ(players[static_cast<std::size_t>(key) - 1].Tell("checks"), 0);
        EXPECT_EQ(Ask("CheckOwner", "timestamp=" + std::to_string(key)).Json()["data"]["owner"], true);
    }
    for (int key = 6; key <= 15; ++key) {  // seeks in the last: its old stream is closed a moment before or after
        Player& sought = players.back();
        if (key % 2 == 0) {
            sought.Close();
        }
        Player next(host_, session_.secret, "PlayMjpegEvent&timestamp=" + std::to_string(key));
        sought = std::move(next);
        EXPECT_TRUE(sought.Tell("rate")) << key;
        EXPECT_EQ(players[2].Tell("checks"), 0) << key;
        EXPECT_EQ(players[3].Tell("checks"), 0) << key;
    }
}

TEST_F(Playback, SweepsWhatAKilledPlayerLeaves) {
    Player player = Play("PlayMjpegEvent&timestamp=1");
    Player elsewhere(host_, host_.LogIn().secret, "PlayMjpegEvent&timestamp=2");
    ASSERT_TRUE(elsewhere.Tell("rate"));
    EXPECT_EQ(ProgressFiles(), 2U);
    pid_t pid = 0;
    std::ifstream(PlayerFile()) >> pid;
    ASSERT_GT(pid, 0);
    kill(pid, SIGKILL);
    EXPECT_TRUE(Eventually(2s, [&] { return ProgressFiles() == 1 && !std::filesystem::exists(PlayerFile()); }));
    EXPECT_EQ(elsewhere.Tell("checks"), 0);
    elsewhere.Close();
    EXPECT_TRUE(Eventually(2s, [&] { return ProgressFiles() == 0; }));
}

// A client that seeks closes one stream and opens the next under the same key.
TEST_F(Playback, KeepsTheKeyOfAPlayerThatFollowsAnother) {
    Player older = Play("PlayMjpegEventNoFrameId&timestamp=7");
    for (int round = 0; round < 10; ++round) {
        Player newer = Play("PlayMjpegEvent&timestamp=7");
        older.Close();
        ASSERT_TRUE(Eventually(2s, [&] { return host_.RequestProcesses() == 1; }));
        EXPECT_TRUE(std::filesystem::exists(PlayerFile())) << "it names the newer one, however soon the older one ends";
        EXPECT_EQ(Ask("SetRate", "timestamp=7&rate=3").status, 200);
        EXPECT_TRUE(Eventually(2s, [&] { return newer.Tell("rate") == 3; })) << round;
        older = std::move(newer);
    }
}

}  // namespace
}  // namespace lookhaven::api
