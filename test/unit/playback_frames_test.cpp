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
    const char* method;
    Change before;
    std::map<int, Change> plan;
    std::string frames;  // the stream is stopped at the fifth picture unless it ends before
};

const Change kGrown = [](auto& p) { p.frame_count = 2, p.grown_by = 9; };
const Change kBroken = [](auto& p) { p.write_result = -1, p.flush_fails = true; };

const FramesRow kFrames[] = {
    {"the last is held", kByIndex, Frames(3), {}, "0:P0 1:P1 2:P2 2:P2 2:P2 "},
    {"lowest ids",
     kByIndex,
     Params({{"eventid", 1}, {"timestamp", 1}}) + [](auto& p) { p.events[1] = p.events[3]; },
     {},
     "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"start past the last frame of the count", kByIndex, Params({{"framestart", 5}}) + kGrown, {}, ""},
    {"broken output", kByIndex, kBroken, {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"rate 4", kByIndex, Frames(10) + Params({{"playrate", 4}}), {}, "0:P0 4:P4 8:P8 9:P9 9:P9 "},
    {"rate -2", kByIndex, Params({{"playrate", -2}}), {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"rate 0", kByIndex, Params({{"playrate", 0}}), {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"changed rate", kByIndex, Nothing, {{2, ClientSets(2)}, {4, ClientSets(-1)}}, "0:P0 1:P1 3:P3 5:P5 7:P7 "},
    {"given stop", kByIndex, Params({{"framestart", 1}, {"framestop", 2}}), {}, "1:P1 2:P2 2:P2 2:P2 2:P2 "},
    {"one frame", kByIndex, Params({{"framestart", 1}, {"framestop", 1}}), {}, "1:P1 1:P1 1:P1 1:P1 1:P1 "},
    {"stop before start", kByIndex, Params({{"framestart", 2}, {"framestop", 1}}), {}, "2:P2 3:P3 4:P4 5:P5 6:P6 "},
    {"stop past the end", kByIndex, Frames(2) + Params({{"framestop", 9}}), {}, "0:P0 1:P1 "},
    {"unreadable", kByIndex, [](auto& p) { p.broken_frames = {2}; }, {}, "0:P0 1:P1 "},
    {"interval 2", kByIndex, Params({{"interval", 2}, {"playrate", 4}}), {}, "0:P0 20:P20 40:P40 60:P60 80:P80 "},
    {"interval 0", kByIndex, Params({{"interval", 0}}), {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"interval 1", kByIndex, Params({{"interval", 1}}), {}, "0:P0 10:P10 20:P20 30:P30 40:P40 "},
    {"step 0",
     kByIndex,
     Params({{"interval", 9}}) + [](auto& p) { p.frame_rate = 0.5; },
     {},
     "0:P0 0:P0 0:P0 0:P0 0:P0 "},
    {"changed to 0 and below",
     kByIndex,
     Params({{"playrate", 3}}),
     {{2, ClientSets(0)}, {4, ClientSets(-2)}},
     "0:P0 3:P3 4:P4 5:P5 6:P6 "},
    {"rate refused", kByIndex, [](auto& p) { p.progress_result = 1; }, {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"no pause", kByIndex, Nothing, {{2, Signal(SIGUSR2)}}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"stopped before", kByIndex, Nothing, {{0, Signal(SIGTERM)}}, ""},
    {"highest rate", kByIndex, Params({{"playrate", INT_MAX}}), {}, "0:P0 99:P99 "},
    {"lowest rate", kByIndex, Params({{"playrate", INT_MIN}}), {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"highest interval", kByIndex, Params({{"interval", INT_MAX}}), {}, "0:P0 "},
    {"lowest interval", kByIndex, Params({{"interval", INT_MIN}}), {}, "0:P0 1:P1 2:P2 3:P3 4:P4 "},
    {"highest frame rate", kByIndex, Params({{"interval", 2}}) + [](auto& p) { p.frame_rate = 1e30F; }, {}, "0:P0 "},

    {"lowest ids",
     kByTime,
     Params({{"eventid", 1}, {"timestamp", 1}}) + [](auto& p) { p.events[1] = p.events[3]; },
     {},
     "P0 P0 P1 P2 P3 "},
    {"start past the last frame of the count", kByTime, Params({{"startTimeMS", 50}}) + kGrown, {}, ""},
    {"broken output", kByTime, kBroken, {}, "P0 P0 P1 P2 P3 "},
    {"to the end", kByTime, Frames(4), {}, "P0 P0 P1 P2 "},
    {"given stop", kByTime, Params({{"startTimeMS", 15}, {"stopTimeMS", 39}}), {}, "P1 P1 P2 "},
    {"one frame", kByTime, Params({{"startTimeMS", 20}, {"stopTimeMS", 25}}), {}, "P2 "},
    {"stop before start", kByTime, Frames(7) + Params({{"startTimeMS", 50}, {"stopTimeMS", 30}}), {}, "P5 P5 "},
    {"start kept in 32 bits", kByTime, Params({{"startTimeMS", Json::Int64{1} << 32}}), {}, "P0 P0 P1 P2 P3 "},
    {"rate 4, then past the end", kByTime, Frames(10) + Params({{"playrate", 4}}), {}, "P0 P3 P7 "},
    {"rate -2", kByTime, Params({{"playrate", -2}}), {}, "P0 P0 P1 P2 P3 "},
    {"rate 0", kByTime, Params({{"playrate", 0}}), {}, "P0 P0 P1 P2 P3 "},
    {"changed rate",
     kByTime,
     Params({{"changerate", 2}}),
     {{2, ClientSets(2)}, {4, ClientSets(-1)}},
     "P0 P0 P2 P4 P6 "},
    {"no rate to follow", kByTime, ClientSets(4), {}, "P0 P0 P1 P2 P3 "},
    {"paused and resumed", kByTime, Nothing, {{2, Signal(SIGUSR2)}, {4, Signal(SIGUSR2)}}, "P0 P0 P0 P0 P1 "},
    {"paused at the first", kByTime, Nothing, {{1, Signal(SIGUSR2)}}, "P0 P0 P0 P0 P0 "},
    {"paused before the first", kByTime, Nothing, {{0, Signal(SIGUSR2)}, {3, Signal(SIGUSR2)}}, "P0 P0 P0 P1 P2 "},
    {"paused at rate 4", kByTime, Params({{"playrate", 4}}), {{2, Signal(SIGUSR2)}}, "P0 P3 P6 P9 P12 "},
    {"paused while sampling", kByTime, Params({{"interval", 0}}), {{3, Signal(SIGUSR2)}}, "0:P0 1:P0 2:P1 2:P1 2:P1 "},
    {"rate followed while sampling",
     kByTime,
     Params({{"interval", 0}, {"changerate", 1}}),
     {{1, ClientSets(4)}},
     "0:P0 1:P0 2:P1 3:P2 4:P3 "},
    {"refused while sampling",
     kByTime,
     Params({{"interval", 0}}) + [](auto& p) { p.progress_result = 1; },
     {},
     "0:P0 "},
    {"stop kept in 32 bits", kByTime, Params({{"stopTimeMS", (Json::Int64{1} << 32) + 39}}), {}, "P0 P0 P1 P2 "},
    {"paused in the middle", kByTime, Params({{"startTimeMS", 70}}), {{3, Signal(SIGUSR2)}}, "P7 P7 P8 P8 P8 "},
    {"interval 2",
     kByTime,
     Frames(30) + Params({{"interval", 2}, {"playrate", 4}}),
     {},
     "0:P0 20:P19 29:P28 29:P28 29:P28 "},
    {"interval 0", kByTime, Params({{"interval", 0}}), {}, "0:P0 1:P0 2:P1 3:P2 4:P3 "},
    {"interval 0 to the end", kByTime, Frames(3) + Params({{"interval", 0}}), {}, "0:P0 1:P0 2:P1 2:P1 2:P1 "},
    {"interval, one frame", kByTime, Frames(1) + Params({{"interval", 0}}), {}, "0:P0 "},
    {"step 0",
     kByTime,
     Params({{"interval", 9}, {"startTimeMS", 20}}) + [](auto& p) { p.frame_rate = 0.5; },
     {},
     "2:P2 2:P1 2:P1 2:P1 2:P1 "},
    {"position refused", kByTime, [](auto& p) { p.progress_result = 1; }, {}, "P0 "},
    {"rate refused",
     kByTime,
     Params({{"changerate", -1}}) + [](auto& p) { p.progress_result = 1; },
     {},
     "P0 P0 P1 P2 P3 "},
    {"stopped before", kByTime, Nothing, {{0, Signal(SIGTERM)}}, ""},
    {"highest rate", kByTime, Params({{"playrate", INT_MAX}, {"startTimeMS", 50}}), {}, "P5 "},
    {"lowest rate", kByTime, Params({{"playrate", INT_MIN}}), {}, "P0 P0 P1 P2 P3 "},
    {"highest interval", kByTime, Params({{"interval", INT_MAX}}), {}, "0:P0 "},
    {"lowest interval", kByTime, Params({{"interval", INT_MIN}}), {}, "P0 P0 P1 P2 P3 "},
};

TEST(Playback, SendsTheRightFrames) {
    for (const auto& row : kFrames) {
        SCOPED_TRACE(std::string(row.method) + " " + row.name);
        Player player(row.method);
        row.before(player.platform);
        EXPECT_EQ(player.Run(row.plan, 5), "") << "no redirect once a frame could be read";
        EXPECT_EQ(player.Frames(), row.frames);
        EXPECT_EQ(player.calls.back(), "SetSuccess(null)");
        if (player.platform.params.count("interval") != 0 && player.platform.params["interval"] >= 0) {
            EXPECT_EQ(player.All("Delay("), "") << "sampling never waits";
        }
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
