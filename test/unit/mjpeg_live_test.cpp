// SPDX-License-Identifier: Apache-2.0
//
// The MJPEG live stream: when its loop sends, pauses, times out and ends.
#include <cerrno>
#include <cstdint>
#include <stdexcept>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/unit/scripted_live.h"

using namespace lookhaven::test;

namespace {

Calls Write(const std::string& data) {
    return {"Write(image/jpeg," + data + "," + std::to_string(data.size()) + ",null)", "fflush()"};
}
const Calls kDone = {"ReadFinish(entry,1,position)", "usleep(10000)"};
Calls TimeOut(int last_seq) {
    return Read(last_seq) + Calls{"ReadFinish(null,1,position)", "log live/4 Timeeout [Cam: 5]\n"};
}
Calls Exit(const char* eof, const char* error, const char* stop) {
    return LoopExit(eof, error, stop) + kClose;
}
Calls Sleeps(std::size_t count) {
    return Calls(count, "sleep(10)");
}

void Pause(ScriptedPlatform& p) {
    p.common_cfg.m_blPause = 1;
}
void LoseService(ScriptedPlatform& p) {
    p.has_common_cfg = false;
}
void NoPictures(ScriptedPlatform& p) {
    p.frames.resize(9);
}

const LoopRow kLoop[] = {
    {"newest picture behind its offset, then nothing newer", Pictures({{{7, "xxAB", 2}}, {}, {{0, "C"}}}),
     Read(10001) + Write("AB") + kDone + Empty(7) + Read(7) + Write("C") + kDone + Empty(0) + Exit("1", "0", "0")},
    {"stopped", Stop, Exit("0", "0", "1")},
    {"broken output", [](auto& p) { p.is_error = true; }, Exit("0", "1", "0")},
    {"stopped while sending", Pictures({{{1, "A"}}, {{2, "B"}}}) + At("fflush()", Stop),
     Read(10001) + Write("A") + kDone + Exit("0", "0", "1")},
    {"paused, then on", Pause + At("sleep(10)", [](auto& p) { p.common_cfg.m_blPause = 0; }),
     Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"paused in mid-stream",
     Pictures({{{1, "A"}}, {{2, "B"}}}) + At("usleep(10000)", [](auto& p) { p.common_cfg.m_blPause = 2; }) +
         At("sleep(10)", Stop),
     Read(10001) + Write("A") + kDone + Sleeps(1) + Exit("0", "0", "1")},
    {"no service, then on",
     LoseService + At("sleep(10)", [](auto& p) { p.has_common_cfg = p.monotonic_now >= 1000020; }),
     Sleeps(2) + Empty(10001) + Exit("1", "0", "0")},
    {"client gone while paused", Pause + At("sleep(10)", [](auto& p) { p.is_eof = true; }),
     Sleeps(1) + Exit("1", "0", "0")},
    {"output broken while paused", LoseService + At("sleep(10)", [](auto& p) { p.is_error = true; }),
     Sleeps(1) + Exit("0", "1", "0")},
    {"stopped while paused", LoseService + At("sleep(10)", Stop), Sleeps(1) + Exit("0", "0", "1")},
    {"a day old", [](auto& p) { p.common_cfg.m_Timestamp -= 86400; }, Empty(10001) + Exit("1", "0", "0")},
    {"older, until refreshed",
     [](auto& p) { p.common_cfg.m_Timestamp -= 86401; } +
         At("sleep(10)", [](auto& p) { p.common_cfg.m_Timestamp = p.monotonic_now; }),
     Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"a day ahead in ten seconds", [](auto& p) { p.common_cfg.m_Timestamp += 86401; },
     Sleeps(1) + Empty(10001) + Exit("1", "0", "0")},
    {"nonsense for a time", [](auto& p) { p.common_cfg.m_Timestamp = INT64_MIN; } + At("sleep(10)", Stop),
     Sleeps(1) + Exit("0", "0", "1")},
    {"a lock that fails counts as locked", [](auto& p) { p.lock_result = EINVAL; }, Empty(10001) + Exit("1", "0", "0")},
    {"time-out after a pause",
     Pause + At("sleep(10)", [](auto& p) { p.common_cfg.m_blPause = p.monotonic_now < 1000030; }),
     Sleeps(3) + TimeOut(10001) + Exit("1", "0", "0")},
    {"twenty seconds are no time-out, twenty-one are",
     NoPictures + At("usleep(10000)", [](auto& p) { p.now += p.now == 1700000000 ? 20 : 1; }),
     Empty(10001) + Empty(10001) + TimeOut(10001) + Exit("0", "0", "0")},
    {"a failing write and flush still count as a write",
     [](auto& p) {
         NoPictures(p), p.frames[1] = {3, "A"}, p.flush_fails = true, p.write_result = -1;
     } + At("usleep(10000)", Later(15)),
     Empty(10001) + Read(10001) + Write("A") + Calls{"log live/4 Failed to fflush data [Cam: 5, errno: 32]\n"} + kDone +
         Empty(3) + TimeOut(3) + Exit("0", "0", "0")},
    {"the time-out begins after the flush", Pictures({{{1, "A"}}}) + At("fflush()", Later(21)),
     Read(10001) + Write("A") + kDone + Empty(1) + Exit("1", "0", "0")},
    {"traces each picture at the highest level",
     Pictures({{{1, "A"}}}) + [](auto& p) { p.log_cfg.m_CategLevel[32] = 6; },
     Read(10001) + Calls{Write("A")[0], "log live/6 Write frame [Cam: 5]\n", "fflush()"} + kDone + Empty(1) +
         Exit("1", "0", "0")},
};

TEST(LiveViewLoop, RunsAndEndsInOrder) {
    for (LoopRow row : kLoop) {
        row.calls = kStart + row.calls;
        RunLoop(row, "LiveviewMjpgCam", [](auto& handler) { handler.LiveviewMjpgCam(5, 51, false); });
    }
}

TEST(LiveViewLoop, TakesTheLockOfADeadOwner) {
    const auto die = [](auto& p) { std::thread([&] { pthread_mutex_lock(&p.common_cfg.m_Mutex); }).join(); };
    RunLoop({"", die, kStart + Empty(10001) + Exit("1", "0", "0")}, "LiveviewMjpgCam",
            [](auto& handler) { handler.LiveviewMjpgCam(5, 51, false); });
}

TEST(LiveViewLoop, SkipsSizesOutOfRangeWithoutTakingTheirNumber) {
    for (const SizeRow& row : kSizes) {
        SCOPED_TRACE(testing::Message() << row.length << " - " << row.offset);
        LiveView test;
        test.frames = {ScriptedFrame{8, "", row.offset, row.length}, {}};
        LiveHandler(test).LiveviewMjpgCam(5, 51, false);
        EXPECT_EQ(test.CallsOf("Write").empty(), !row.sent);
        EXPECT_EQ(test.CallsOf("ReadLatest").at(1), row.sent ? "ReadLatest(8,position)" : "ReadLatest(10001,position)");
        EXPECT_THAT(test.calls, testing::Contains("ReadFinish(entry,1,position)"));
    }
}

TEST(LiveViewLoop, SelfDeadlockThrowsAndLeavesTheSegment) {
    LiveView test;
    pthread_mutex_lock(&test.common_cfg.m_Mutex);
    EXPECT_THAT([&] { LiveHandler(test).LiveviewMjpgCam(5, 51, false); },
                testing::ThrowsMessage<std::runtime_error>("Potential self-deadlock detected!"));
    EXPECT_EQ(test.CallsFrom("StartRead"), kStart);
    pthread_mutex_unlock(&test.common_cfg.m_Mutex);
}

}  // namespace
