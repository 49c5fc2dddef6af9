// SPDX-License-Identifier: Apache-2.0
//
// The muxed live stream: where it begins, what it forwards and skips, how it ends.
#include <algorithm>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/unit/scripted_live.h"

using namespace lookhaven::test;

namespace {

ScriptedFrame Key(int seq, const std::string& data) {
    return {seq, data, 0, -1, true, 0x500000001LL};
}
ScriptedFrame Delta(int seq, const std::string& data) {
    return {seq, data, 0, -1, false, 7};
}

const Calls kOpen = {"StartRead(position)", "audio StartRead(audio position)", "ReadLatestIFrame()"};
const Calls kNoStart = kOpen + Calls{"ReadIFrameFinish(null,null)"};
const Calls kUpdate = {"GetVdoExtraData(1024)", "audio GetAdoExtraData(1024)"};
const Calls kClose = {"StopRead(position)", "audio StopRead(audio position)", "shmdt()", "audio shmdt()",
                      "SetEnableOutput(0)"};

Calls WriteOf(const std::string& type, const std::string& data, const std::string& timestamp) {
    return {"Write(" + type + ",H264;AAC,V,A," + timestamp + "," + data + "," + std::to_string(data.size()) + ",null)",
            "fflush()"};
}
Calls WriteKey(const std::string& data) {
    return WriteOf("image/H264", data, "21474836481");
}
Calls WriteDelta(const std::string& data) {
    return WriteOf("image/H264", data, "7");
}
Calls WriteSound(const std::string& data) {
    return WriteOf("audio/AAC", data, "7");
}
// The two halves of a pass, with what is written in between.
Calls Video(int seq, const Calls& written, const char* entry = "entry") {
    return Calls{"UpdateStamp()", "ReadNext(" + std::to_string(seq) + ",position)"} + written +
           Calls{std::string("ReadFinish(") + entry + ",1,position)"};
}
Calls Audio(int seq, const Calls& written, const char* entry = "entry") {
    return Calls{"audio ReadNext(" + std::to_string(seq) + ",audio position)"} + written +
           Calls{std::string("audio ReadFinish(") + entry + ",0,audio position)"};
}
Calls NothingNew(int video, int audio) {
    return Video(video, {}, "null") + Audio(audio, {}, "null");
}
const Calls kRest = {"usleep(10000)"};
Calls Exit(const char* eof, const char* stop) {
    return LoopExit(eof, "0", stop) + kClose;
}
Calls Started(const std::string& data) {
    return kOpen + kUpdate + WriteKey(data) +
           Calls{"log live/5 Flush latest i-frame. [FrameSize: " + std::to_string(data.size()) + "]\n",
                 "ReadIFrameFinish(entry,null)"};
}

Change Begins(const ScriptedFrame& newest, const ScriptedFrames& frames, const ScriptedFrames& audio = {}) {
    return [=](ScriptedPlatform& p) { p.newest_key_frame = newest, p.frames = frames, p.audio_frames = audio; };
}

const LoopRow kRows[] = {
    {"begins with the newest key frame and forwards both media without a rest",
     Begins(Key(40, "K"), {Delta(41, "d"), {}, Delta(0, "e")}, {Delta(8, "s"), Delta(9, "t")}),
     {},
     Started("K") + Video(40, WriteDelta("d")) + Audio(10001, WriteSound("s")) + Video(41, {}, "null") +
         Audio(8, WriteSound("t")) + Video(41, WriteDelta("e")) + Audio(9, {}, "null") + NothingNew(0, 9) + kRest +
         Exit("1", "0")},
    {"without one waits, dropping sound and frames that need an earlier one, whose numbers it takes",
     [](auto& p) {
         p.frames = {Delta(3, "d"), Key(4, "K")};
         p.audio_frames = {Delta(1, "s"), Delta(2, "t")};
     },
     {},
     kNoStart + Video(10001, {}) + Audio(10001, {}) + kRest + Video(3, kUpdate + WriteKey("K")) +
         Audio(1, WriteSound("t")) + NothingNew(4, 2) + kRest + Exit("1", "0")},
    {"an empty start frame is none",
     Begins(Key(40, ""), {Key(41, "K")}),
     {},
     kOpen + Calls{"ReadIFrameFinish(entry,null)"} + Video(10001, kUpdate + WriteKey("K")) + Audio(10001, {}, "null") +
         NothingNew(41, 10001) + kRest + Exit("1", "0")},
    {"describes the stream as at its first key frame",
     Begins(Key(40, "K"), {Key(41, "L")}),
     {{"ReadIFrameFinish(entry,null)", [](auto& p) { p.video_codec = p.audio_codec = p.video_extra = "other"; }}},
     Started("K") + Video(40, WriteKey("L")) + Audio(10001, {}, "null") + NothingNew(41, 10001) + kRest +
         Exit("1", "0")},
    {"stopped between picture and sound",
     Begins(Key(40, "K"), {Delta(41, "d")}),
     {{"ReadFinish(entry,1,position)", Stop}},
     Started("K") + Video(40, WriteDelta("d")) + Exit("0", "1")},
    {"stopped before the first pass", Stop, {}, kNoStart + Exit("0", "1")},
    {"paused, then on",
     [](auto& p) { p.common_cfg.m_blPause = 1; },
     {{"sleep(10)", [](auto& p) { p.common_cfg.m_blPause = 0; }}},
     kNoStart + Calls{"sleep(10)"} + NothingNew(10001, 10001) + kRest + Exit("1", "0")},
    {"dropped frames keep no stream alive",
     Pictures({Delta(1, "d"), Delta(2, "d"), Delta(3, "d")}),
     {{"usleep(10000)", Later(20)}},
     kNoStart + Video(10001, {}) + Audio(10001, {}, "null") + kRest + Video(1, {}) + Audio(10001, {}, "null") + kRest +
         Video(2, {}) + Audio(10001, {}, "null") + Calls{"log live/4 Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"sound alone keeps it alive, and a long pass that wrote is no time-out",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames.resize(3);
         p.audio_frames = {Delta(8, "s")};
     },
     {{"UpdateStamp()", Later(15)}},
     Started("K") + Video(40, {}, "null") + Audio(10001, WriteSound("s")) + NothingNew(40, 8) + kRest +
         NothingNew(40, 8) + Calls{"log live/4 Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"failing output is logged for pictures of the loop only",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames = {Delta(41, "d")};
         p.audio_frames = {Delta(8, "s")};
         p.flush_fails = true, p.write_result = -1;
     },
     {},
     Started("K") + Video(40, WriteDelta("d") + Calls{"log live/4 Failed to fflush data [Cam: 5, errno: 32]\n"}) +
         Audio(10001, WriteSound("s")) + NothingNew(41, 8) + kRest + Exit("1", "0")},
};

TEST(MuxedLive, BeginsForwardsAndEnds) {
    for (const LoopRow& row : kRows) {
        RunLoop(row, "LiveviewMpeg4Cam", [](auto& handler) { handler.LiveviewMpeg4Cam(5, 51); });
    }
}

TEST(MuxedLive, SkipsSizesOutOfRangeWithoutTakingTheirNumber) {
    struct Size {
        int length, offset;
        bool sent;
    };
    for (const Size& size : {Size{0, 0, false}, Size{9, 9, false}, Size{1, 0, true}, Size{4194303 + 4, 4, true},
                             Size{4194304, 0, false}}) {
        SCOPED_TRACE(testing::Message() << size.length << " - " << size.offset);
        LiveView test;
        auto& platform = test.platform;
        platform.newest_key_frame = Key(40, "K");
        platform.frames = {ScriptedFrame{41, "", size.offset, size.length}, {}};
        platform.audio_frames = {ScriptedFrame{8, "", size.offset, size.length}};
        LiveHandler(platform).LiveviewMpeg4Cam(5, 51);
        const auto count = [&](const std::string& text) {
            return std::count_if(platform.calls.begin(), platform.calls.end(),
                                 [&](const auto& call) { return call.rfind(text, 0) == 0; });
        };
        EXPECT_EQ(count(size.sent ? "ReadNext(41,position)" : "ReadNext(40,position)"), size.sent ? 2 : 3);
        EXPECT_EQ(count(size.sent ? "audio ReadNext(8,audio position)" : "audio ReadNext(10001,audio position)"),
                  size.sent ? 2 : 3);
        EXPECT_EQ(count("Write("), size.sent ? 3 : 1);
    }
}

TEST(MuxedLive, TracesEachPartAtTheHighestLevel) {
    LiveView test;
    auto& platform = test.platform;
    platform.log_cfg.m_CategLevel[32] = 6;
    platform.newest_key_frame = Key(40, "KK");
    platform.frames = {Delta(41, "ddd")};
    platform.audio_frames = {Delta(8, "s")};
    LiveHandler(platform).LiveviewMpeg4Cam(5, 51);
    std::string lines;
    for (const auto& log : platform.logs) {
        lines += log.level + " " + log.text;
    }
    EXPECT_THAT(lines, testing::StartsWith("5 Flush latest i-frame. [FrameSize: 2]\n"
                                           "6 Flush video frame. [FrameSize: 3]\n"
                                           "6 Flush latest audio. [FrameSize: 1]\n5 Exit loop"));
}

}  // namespace
