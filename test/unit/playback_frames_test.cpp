// SPDX-License-Identifier: Apache-2.0
//
// Which frames each loop of playback sends, how fast, and what it publishes meanwhile.
#include <climits>
#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/unit/scripted_player.h"

using namespace lookhaven::test;

namespace {

struct FramesRow {
    const char* name;
    std::string frames;  // the stream is stopped at the fifth picture unless it ends before
    Change before = Nothing;
    std::map<int, Change> plan = {};
};

const Change kRefused = [](auto& p) { p.progress_result = 1; };
const Change kHalfFps = [](auto& p) { p.frame_rate = 0.5; };
const Change kEvent1 = [](auto& p) { p.events[1] = p.events[3]; };
const Change kGrown = [](auto& p) { p.frame_count = 2, p.grown_by = 9; };
const Change kBroken = [](auto& p) { p.write_result = -1, p.flush_fails = true; };

const FramesRow kByIndexRows[] = {
    {"the last is held", "0:P0 1:P1 2:P2 2:P2 2:P2 ", Frames(3)},
    {"lowest ids", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"eventid", 1}, {"timestamp", 1}}) + kEvent1},
    {"start past the last frame of the count", "", Params({{"framestart", 5}}) + kGrown},
    {"broken output", "0:P0 1:P1 2:P2 3:P3 4:P4 ", kBroken},
    {"rate 4", "0:P0 4:P4 8:P8 9:P9 9:P9 ", Frames(10) + Params({{"playrate", 4}})},
    {"rate -2", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"playrate", -2}})},
    {"rate 0", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"playrate", 0}})},
    {"changed rate", "0:P0 1:P1 3:P3 5:P5 7:P7 ", Nothing, {{2, ClientSets(2)}, {4, ClientSets(-1)}}},
    {"given stop", "1:P1 2:P2 2:P2 2:P2 2:P2 ", Params({{"framestart", 1}, {"framestop", 2}})},
    {"one frame", "1:P1 1:P1 1:P1 1:P1 1:P1 ", Params({{"framestart", 1}, {"framestop", 1}})},
    {"stop before start", "2:P2 3:P3 4:P4 5:P5 6:P6 ", Params({{"framestart", 2}, {"framestop", 1}})},
    {"stop past the end", "0:P0 1:P1 ", Frames(2) + Params({{"framestop", 9}})},
    {"unreadable", "0:P0 1:P1 ", [](auto& p) { p.broken_frames = {2}; }},
    {"interval 2", "0:P0 20:P20 40:P40 60:P60 80:P80 ", Params({{"interval", 2}, {"playrate", 4}})},
    {"interval 0", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"interval", 0}})},
    {"interval 1", "0:P0 10:P10 20:P20 30:P30 40:P40 ", Params({{"interval", 1}})},
    {"step 0", "0:P0 0:P0 0:P0 0:P0 0:P0 ", Params({{"interval", 9}}) + kHalfFps},
    {"changed to 0 and below",
     "0:P0 3:P3 4:P4 5:P5 6:P6 ",
     Params({{"playrate", 3}}),
     {{2, ClientSets(0)}, {4, ClientSets(-2)}}},
    {"rate refused", "0:P0 1:P1 2:P2 3:P3 4:P4 ", kRefused},
    {"no pause", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Nothing, {{2, Signal(SIGUSR2)}}},
    {"stopped before", "", Nothing, {{0, Signal(SIGTERM)}}},
    {"highest rate", "0:P0 99:P99 ", Params({{"playrate", INT_MAX}})},
    {"lowest rate", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"playrate", INT_MIN}})},
    {"highest interval", "0:P0 ", Params({{"interval", INT_MAX}})},
    {"lowest interval", "0:P0 1:P1 2:P2 3:P3 4:P4 ", Params({{"interval", INT_MIN}})},
    {"highest frame rate", "0:P0 ", Params({{"interval", 2}}) + [](auto& p) { p.frame_rate = 1e30F; }},
};

const FramesRow kByTimeRows[] = {
    {"lowest ids", "P0 P0 P1 P2 P3 ", Params({{"eventid", 1}, {"timestamp", 1}}) + kEvent1},
    {"start past the last frame of the count", "", Params({{"startTimeMS", 50}}) + kGrown},
    {"broken output", "P0 P0 P1 P2 P3 ", kBroken},
    {"to the end", "P0 P0 P1 P2 ", Frames(4)},
    {"given stop", "P1 P1 P2 ", Params({{"startTimeMS", 15}, {"stopTimeMS", 39}})},
    {"one frame", "P2 ", Params({{"startTimeMS", 20}, {"stopTimeMS", 25}})},
    {"stop before start", "P5 P5 ", Frames(7) + Params({{"startTimeMS", 50}, {"stopTimeMS", 30}})},
    {"start kept in 32 bits", "P0 P0 P1 P2 P3 ", Params({{"startTimeMS", Json::Int64{1} << 32}})},
    {"rate 4, then past the end", "P0 P3 P7 ", Frames(10) + Params({{"playrate", 4}})},
    {"rate -2", "P0 P0 P1 P2 P3 ", Params({{"playrate", -2}})},
    {"rate 0", "P0 P0 P1 P2 P3 ", Params({{"playrate", 0}})},
    {"changed rate", "P0 P0 P2 P4 P6 ", Params({{"changerate", 2}}), {{2, ClientSets(2)}, {4, ClientSets(-1)}}},
    {"no rate to follow", "P0 P0 P1 P2 P3 ", ClientSets(4)},
    {"paused and resumed", "P0 P0 P0 P0 P1 ", Nothing, {{2, Signal(SIGUSR2)}, {4, Signal(SIGUSR2)}}},
    {"paused at the first", "P0 P0 P0 P0 P0 ", Nothing, {{1, Signal(SIGUSR2)}}},
    {"paused before the first", "P0 P0 P0 P1 P2 ", Nothing, {{0, Signal(SIGUSR2)}, {3, Signal(SIGUSR2)}}},
    {"paused at rate 4", "P0 P3 P6 P9 P12 ", Params({{"playrate", 4}}), {{2, Signal(SIGUSR2)}}},
    {"paused while sampling", "0:P0 1:P0 2:P1 2:P1 2:P1 ", Params({{"interval", 0}}), {{3, Signal(SIGUSR2)}}},
    {"rate followed while sampling",
     "0:P0 1:P0 2:P1 3:P2 4:P3 ",
     Params({{"interval", 0}, {"changerate", 1}}),
     {{1, ClientSets(4)}}},
    {"refused while sampling", "0:P0 ", Params({{"interval", 0}}) + kRefused},
    {"stop kept in 32 bits", "P0 P0 P1 P2 ", Params({{"stopTimeMS", (Json::Int64{1} << 32) + 39}})},
    {"paused in the middle", "P7 P7 P8 P8 P8 ", Params({{"startTimeMS", 70}}), {{3, Signal(SIGUSR2)}}},
    {"interval 2", "0:P0 20:P19 29:P28 29:P28 29:P28 ", Frames(30) + Params({{"interval", 2}, {"playrate", 4}})},
    {"interval 0", "0:P0 1:P0 2:P1 3:P2 4:P3 ", Params({{"interval", 0}})},
    {"interval 0 to the end", "0:P0 1:P0 2:P1 2:P1 2:P1 ", Frames(3) + Params({{"interval", 0}})},
    {"interval, one frame", "0:P0 ", Frames(1) + Params({{"interval", 0}})},
    {"step 0", "2:P2 2:P1 2:P1 2:P1 2:P1 ", Params({{"interval", 9}, {"startTimeMS", 20}}) + kHalfFps},
    {"position refused", "P0 ", kRefused},
    {"rate refused", "P0 P0 P1 P2 P3 ", Params({{"changerate", -1}}) + kRefused},
    {"stopped before", "", Nothing, {{0, Signal(SIGTERM)}}},
    {"highest rate", "P5 ", Params({{"playrate", INT_MAX}, {"startTimeMS", 50}})},
    {"lowest rate", "P0 P0 P1 P2 P3 ", Params({{"playrate", INT_MIN}})},
    {"highest interval", "0:P0 ", Params({{"interval", INT_MAX}})},
    {"lowest interval", "P0 P0 P1 P2 P3 ", Params({{"interval", INT_MIN}})},
};

TEST(Playback, SendsTheRightFrames) {
    const auto check = [](const char* method, const FramesRow& row) {
        SCOPED_TRACE(std::string(method) + " " + row.name);
        Player player(method);
        row.before(player.platform);
        EXPECT_EQ(player.Run(row.plan, 5), "") << "no redirect once a frame could be read";
        EXPECT_EQ(player.Frames(), row.frames);
        EXPECT_EQ(player.calls.back(), "SetSuccess(null)");
        if (player.platform.params.count("interval") != 0 && player.platform.params["interval"] >= 0) {
            EXPECT_EQ(player.All("Delay("), "") << "sampling never waits";
        }
    };
    for (const auto& row : kByIndexRows) {
        check(kByIndex, row);
    }
    for (const auto& row : kByTimeRows) {
        check(kByTime, row);
    }
}

TEST(Playback, PacesByFrameAndPlayRate) {
    struct Row {
        float frame_rate;
        int rate, client_rate;
        const char* delays;
    };
    const Row rows[] = {
        {10, 1, -1, "100000 "},
        {10, 4, -1, "100000 "},
        {10, -2, 8, "200000 100000 "},
        {10, 1, -3, "100000 300000 "},
        {3, 1, 1, "333333 "},
        {0.5, -4, -1, "8000000 "},
        {10, INT_MIN, INT_MAX, "0 100000 "},
        {1e-30F, 1, INT_MIN, "2147483647 -2147483648 "},
        {-10, -2, -1, "-200000 "},
        {NAN, -1, -1, "0 "},
    };
    for (const auto& row : rows) {
        for (const char* method : {kByIndex, kByTime}) {
            SCOPED_TRACE(testing::Message() << method << " " << row.frame_rate << " " << row.rate);
            Player player(method);
            player.platform.frame_rate = row.frame_rate;
            Params({{"playrate", row.rate}, {"changerate", 1}})(player.platform);
            ClientSets(row.client_rate)(player.platform);
            player.Run({}, 2);
            EXPECT_EQ(player.All("SetDelayTime("), row.delays);
            EXPECT_EQ(player.All("Set("), std::to_string(row.rate) + " ");
            EXPECT_EQ(player.All("BeginTiming("), " ");
        }
    }
}

TEST(Playback, PublishesTheTimeOfTheLabelOrTheRate) {
    Player player(kByTime);
    player.Run({}, 4);
    EXPECT_EQ(player.All("Set("), "0 10 20 30 ");
    EXPECT_EQ(player.All("Get("), "");
    for (const char* method : {kByIndex, kByTime}) {
        Player unmoved(method);
        Params({{"playrate", 0}, {"changerate", 1}})(unmoved.platform);
        unmoved.Run({}, 1);
        EXPECT_EQ(unmoved.All("Set("), "1 ") << method;
    }
    Player refused(kByTime);
    refused.platform.progress_result = 1;
    Params({{"mountid", 4}, {"timestamp", Json::Int64{1} << 32}, {"flushHeader", 1}})(refused.platform);
    refused.Run({}, 5);
    EXPECT_EQ(refused.All("ProgressIndicator("), "4294967296 ");
    EXPECT_THAT(refused.calls, testing::Contains("Event::Load(3,4,0,0)").Times(2));
    EXPECT_EQ(refused.All("Delay("), "") << "nothing more is sent or read once the position is refused";
}

}  // namespace
