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

// The stream is stopped at the fifth picture unless it ends before. Null where the row is not for that loop.
struct FramesRow {
    const char *name, *by_index, *by_time;
    Change before = Nothing;
    std::map<int, Change> plan = {};
};

const Change kRefused = [](auto& p) { p.progress_result = 1; };
const Change kHalfFps = [](auto& p) { p.frame_rate = 0.5; };
const Change kEvent1 = [](auto& p) { p.events[1] = p.events[3]; };
const Change kGrown = [](auto& p) { p.frame_count = 2, p.grown_by = 9; };
const Change kBroken = [](auto& p) { p.write_result = -1, p.flush_fails = true; };

const char* const kAll = "0:P0 1:P1 2:P2 3:P3 4:P4 ";
const char* const kAllByTime = "P0 P0 P1 P2 P3 ";

const FramesRow kRows[] = {
    {"lowest ids", kAll, kAllByTime, Params({{"eventid", 1}, {"timestamp", 1}}) + kEvent1},
    {"start past the last frame of the count", "", "", Params({{"framestart", 5}, {"startTimeMS", 50}}) + kGrown},
    {"broken output", kAll, kAllByTime, kBroken},
    {"rate 4, then past the end", "0:P0 4:P4 8:P8 9:P9 9:P9 ", "P0 P3 P7 ", Frames(10) + Params({{"playrate", 4}})},
    {"rate -2", kAll, kAllByTime, Params({{"playrate", -2}})},
    {"rate 0", kAll, kAllByTime, Params({{"playrate", 0}})},
    {"changed rate",
     "0:P0 1:P1 3:P3 5:P5 7:P7 ",
     "P0 P0 P2 P4 P6 ",
     Params({{"changerate", 2}}),
     {{2, ClientSets(2)}, {4, ClientSets(-1)}}},
    {"rate refused", kAll, kAllByTime, Params({{"changerate", -1}}) + kRefused},
    {"interval 0", kAll, "0:P0 1:P0 2:P1 3:P2 4:P3 ", Params({{"interval", 0}})},
    {"step 0", "0:P0 0:P0 0:P0 0:P0 0:P0 ", "2:P2 2:P1 2:P1 2:P1 2:P1 ",
     Params({{"interval", 9}, {"startTimeMS", 20}}) + kHalfFps},
    {"stopped before", "", "", Nothing, {{0, Signal(SIGTERM)}}},
    {"highest rate", "0:P0 99:P99 ", "P5 ", Params({{"playrate", INT_MAX}, {"startTimeMS", 50}})},
    {"lowest rate", kAll, kAllByTime, Params({{"playrate", INT_MIN}})},
    {"highest interval", "0:P0 ", "0:P0 ", Params({{"interval", INT_MAX}})},
    {"lowest interval", kAll, kAllByTime, Params({{"interval", INT_MIN}})},
    {"the last is held by index only", "0:P0 1:P1 2:P2 2:P2 2:P2 ", "P0 P0 P1 ", Frames(3)},
    {"given stop", "1:P1 2:P2 2:P2 2:P2 2:P2 ", nullptr, Params({{"framestart", 1}, {"framestop", 2}})},
    {"one frame", "1:P1 1:P1 1:P1 1:P1 1:P1 ", nullptr, Params({{"framestart", 1}, {"framestop", 1}})},
    {"stop before start", "2:P2 3:P3 4:P4 5:P5 6:P6 ", nullptr, Params({{"framestart", 2}, {"framestop", 1}})},
    {"stop past the end", "0:P0 1:P1 ", nullptr, Frames(2) + Params({{"framestop", 9}})},
    {"unreadable", "0:P0 1:P1 ", nullptr, [](auto& p) { p.broken_frames = {2}; }},
    {"interval 2", "0:P0 20:P20 40:P40 60:P60 80:P80 ", nullptr, Params({{"interval", 2}, {"playrate", 4}})},
    {"interval 1", "0:P0 10:P10 20:P20 30:P30 40:P40 ", nullptr, Params({{"interval", 1}})},
    {"changed to 0 and below",
     "0:P0 3:P3 4:P4 5:P5 6:P6 ",
     nullptr,
     Params({{"playrate", 3}}),
     {{2, ClientSets(0)}, {4, ClientSets(-2)}}},
    {"highest frame rate", "0:P0 ", nullptr, Params({{"interval", 2}}) + [](auto& p) { p.frame_rate = 1e30F; }},
    {"given stop", nullptr, "P1 P1 P2 ", Params({{"startTimeMS", 15}, {"stopTimeMS", 39}})},
    {"one frame", nullptr, "P2 ", Params({{"startTimeMS", 20}, {"stopTimeMS", 25}})},
    {"stop before start", nullptr, "P5 P5 ", Frames(7) + Params({{"startTimeMS", 50}, {"stopTimeMS", 30}})},
    {"start kept in 32 bits", nullptr, kAllByTime, Params({{"startTimeMS", Json::Int64{1} << 32}})},
    {"no rate to follow", nullptr, kAllByTime, ClientSets(4)},
    {"paused and resumed", nullptr, "P0 P0 P0 P0 P1 ", Nothing, {{2, Signal(SIGUSR2)}, {4, Signal(SIGUSR2)}}},
    {"paused at the first, by time only", kAll, "P0 P0 P0 P0 P0 ", Nothing, {{1, Signal(SIGUSR2)}}},
    {"paused before the first", nullptr, "P0 P0 P0 P1 P2 ", Nothing, {{0, Signal(SIGUSR2)}, {3, Signal(SIGUSR2)}}},
    {"paused at rate 4", nullptr, "P0 P3 P6 P9 P12 ", Params({{"playrate", 4}}), {{2, Signal(SIGUSR2)}}},
    {"paused while sampling", nullptr, "0:P0 1:P0 2:P1 2:P1 2:P1 ", Params({{"interval", 0}}), {{3, Signal(SIGUSR2)}}},
    {"rate followed while sampling",
     nullptr,
     "0:P0 1:P0 2:P1 3:P2 4:P3 ",
     Params({{"interval", 0}, {"changerate", 1}}),
     {{1, ClientSets(4)}}},
    {"refused while sampling", nullptr, "0:P0 ", Params({{"interval", 0}}) + kRefused},
    {"stop kept in 32 bits", nullptr, "P0 P0 P1 P2 ", Params({{"stopTimeMS", (Json::Int64{1} << 32) + 39}})},
    {"paused in the middle", nullptr, "P7 P7 P8 P8 P8 ", Params({{"startTimeMS", 70}}), {{3, Signal(SIGUSR2)}}},
    {"interval 2", nullptr, "0:P0 20:P19 29:P28 29:P28 29:P28 ",
     Frames(30) + Params({{"interval", 2}, {"playrate", 4}})},
    {"interval 0 to the end", nullptr, "0:P0 1:P0 2:P1 2:P1 2:P1 ", Frames(3) + Params({{"interval", 0}})},
    {"interval, one frame", nullptr, "0:P0 ", Frames(1) + Params({{"interval", 0}})},
    {"position refused", nullptr, "P0 ", kRefused},
};

TEST(Playback, SendsTheRightFrames) {
    for (const auto& row : kRows) {
        for (const char* method : {kByIndex, kByTime}) {
            const char* frames = method == kByIndex ? row.by_index : row.by_time;
            if (frames == nullptr) {
                continue;
            }
            SCOPED_TRACE(std::string(method) + " " + row.name);
            Player player(method);
            row.before(player);
            EXPECT_EQ(player.Run(row.plan, 5), "") << "no redirect once a frame could be read";
            EXPECT_EQ(player.Frames(), frames);
            EXPECT_EQ(player.calls.back(), "SetSuccess(null)");
            if (player.params.count("interval") != 0 && player.params["interval"] >= 0) {
                EXPECT_EQ(player.All("Delay("), "") << "sampling never waits";
            }
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
            player.frame_rate = row.frame_rate;
            Params({{"playrate", row.rate}, {"changerate", 1}})(player);
            ClientSets(row.client_rate)(player);
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
        Params({{"playrate", 0}, {"changerate", 1}})(unmoved);
        unmoved.Run({}, 1);
        EXPECT_EQ(unmoved.All("Set("), "1 ") << method;
    }
    Player refused(kByTime);
    refused.progress_result = -1;
    Params({{"mountid", 4}, {"timestamp", Json::Int64{1} << 32}, {"flushHeader", 1}})(refused);
    refused.Run({}, 5);
    EXPECT_EQ(refused.All("ProgressIndicator("), "4294967296 ");
    EXPECT_THAT(refused.calls, testing::Contains("Event::Load(3,4,0,0)").Times(2));
    EXPECT_EQ(refused.All("Delay("), "") << "nothing more is sent or read once the position is refused";
}

}  // namespace
