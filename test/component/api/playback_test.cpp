// SPDX-License-Identifier: Apache-2.0
//
// Players under the host: the rate, position and pause of VEXO.Playback, who may reach whom, hand-over between players
// of a session, and what is swept behind them.
#include <array>
#include <charconv>
#include <chrono>
#include <csignal>
#include <fstream>
#include <thread>

#include <gtest/gtest.h>
#include <sys/socket.h>

#include "standalone/store/settings.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::Eventually;
using host::HostUnderTest;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

// A player's stream, read by the test.
class Player {
  public:
    Player(const HostUnderTest& host, const std::string& cookie, const std::string& query)
        : connection_(host.OpenQuery("api=VEXO.Lookhaven.Player&version=1&method=" + query, cookie)) {}

    // The number behind name in the newest part; waits for a part that came after this call. Nothing when it has ended.
    std::optional<int> Tell(const std::string& name) {
        Read();
        text_.clear();
        const auto until = Clock::now() + 5s;
        for (std::string wanted = name + "="; !ended_ && Clock::now() < until; Read()) {
            const std::size_t end = text_.rfind(';');
            const std::size_t begin = end == text_.npos ? end : text_.rfind("rate=", end);
            const std::size_t at = begin == text_.npos ? begin : text_.find(wanted, begin);
            if (at != text_.npos && at < end) {
                return std::stoi(text_.substr(at + wanted.size()));
            }
        }
        return std::nullopt;
    }
    bool HasEnded() {
        Read();
        return ended_;
    }
    void Close() { connection_.Reset(); }

  private:
    void Read() {
        std::array<char, 65536> block{};
        const timeval limit{0, 20'000};
        setsockopt(connection_.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
        const ssize_t got = recv(connection_.Get(), block.data(), block.size(), 0);
        if (got > 0) {
            text_.append(block.data(), static_cast<std::size_t>(got));
        } else {
            ended_ = got == 0 || (errno != EAGAIN && errno != EINTR);
        }
    }

    base::FileDescriptor connection_;
    std::string text_;
    bool ended_ = false;
};

class Playback : public testing::Test {
  protected:
    // Its players tidy up behind themselves.
    ~Playback() override { host_.End(SIGTERM); }

    Player Play(const std::string& query) {
        Player player(host_, session_.secret, query);
        EXPECT_TRUE(player.Tell("rate")) << query;
        return player;
    }
    Answer Ask(const std::string& method, const std::string& form, const std::string& cookie = "") const {
        return host_.Ask("api=VEXO.Playback&version=1&method=" + method, cookie.empty() ? session_.secret : cookie, {},
                         form);
    }
    std::filesystem::path PlayerFile() const { return "/tmp/player_src.pid." + session_.handle; }
    std::size_t ProgressFiles() const {
        std::error_code error;
        return static_cast<std::size_t>(
            std::distance(std::filesystem::directory_iterator(host_.Home().ProgressFolder(), error), {}));
    }

    HostUnderTest host_;
    store::NewSession session_ = host_.LogIn();
};

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
    {
        store::Store records = store::Store::Open(host_.Home().StoreUrl());
        store::Settings(records).Set("players_per_session", "3");
    }
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
        EXPECT_EQ(Ask("SetRate", "timestamp=7&rate=3").status, 200);
        EXPECT_TRUE(Eventually(2s, [&] { return newer.Tell("rate") == 3; })) << round;
        older = std::move(newer);
    }
}

}  // namespace
}  // namespace lookhaven::api
