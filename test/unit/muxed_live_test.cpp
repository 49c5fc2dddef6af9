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
const Calls kEnd = {"StopRead(position)", "audio StopRead(audio position)", "shmdt()", "audio shmdt()",
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
    return LoopExit(eof, "0", stop) + kEnd;
}
Calls Started(const std::string& data) {
    return kOpen + kUpdate + WriteKey(data) +
           Calls{"log live/5 Flush latest i-frame. [FrameSize: " + std::to_string(data.size()) + "]\n",
                 "ReadIFrameFinish(entry,null)"};
}

Change Begins(const ScriptedFrame& newest, const ScriptedFrames& frames) {
    return Pictures(frames) + [=](ScriptedPlatform& p) { p.newest_key_frame = newest; };
}
Change WithSound(const ScriptedFrames& frames) {
    return [=](ScriptedPlatform& p) { p.audio_frames = frames; };
}
const Change kBoth = Begins(Key(40, "KK"), {Delta(41, "ddd")}) + WithSound({Delta(8, "s")});

const LoopRow kRows[] = {
    {"begins with the newest key frame and forwards both media without a rest",
     Begins(Key(40, "K"), {Delta(41, "d"), {}, Delta(0, "e")}) + WithSound({Delta(8, "s"), Delta(9, "t")}),
     Started("K") + Video(40, WriteDelta("d")) + Audio(10001, WriteSound("s")) + Video(41, {}, "null") +
         Audio(8, WriteSound("t")) + Video(41, WriteDelta("e")) + Audio(9, {}, "null") + NothingNew(0, 9) + kRest +
         Exit("1", "0")},
    {"without one waits, dropping sound and frames that need an earlier one, whose numbers it takes",
     Pictures({Delta(3, "d"), Key(4, "K")}) + WithSound({Delta(1, "s"), Delta(2, "t")}),
     kNoStart + Video(10001, {}) + Audio(10001, {}) + kRest + Video(3, kUpdate + WriteKey("K")) +
         Audio(1, WriteSound("t")) + NothingNew(4, 2) + kRest + Exit("1", "0")},
    {"an empty start frame is none", Begins(Key(40, ""), {Key(41, "K")}),
     kOpen + Calls{"ReadIFrameFinish(entry,null)"} + Video(10001, kUpdate + WriteKey("K")) + Audio(10001, {}, "null") +
         NothingNew(41, 10001) + kRest + Exit("1", "0")},
    {"describes the stream as at its first key frame",
     Begins(Key(40, "K"), {Key(41, "L")}) +
         At("ReadIFrameFinish(entry,null)", [](auto& p) { p.video_codec = p.audio_codec = p.video_extra = "other"; }),
     Started("K") + Video(40, WriteKey("L")) + Audio(10001, {}, "null") + NothingNew(41, 10001) + kRest +
         Exit("1", "0")},
    {"stopped between picture and sound",
     Begins(Key(40, "K"), {Delta(41, "d")}) + At("ReadFinish(entry,1,position)", Stop),
     Started("K") + Video(40, WriteDelta("d")) + Exit("0", "1")},
    {"stopped before the first pass", Stop, kNoStart + Exit("0", "1")},
    {"paused, then on",
     [](auto& p) { p.common_cfg.m_blPause = 1; } + At("sleep(10)", [](auto& p) { p.common_cfg.m_blPause = 0; }),
     kNoStart + Calls{"sleep(10)"} + NothingNew(10001, 10001) + kRest + Exit("1", "0")},
    {"dropped frames keep no stream alive",
     Pictures({Delta(1, "d"), Delta(2, "d"), Delta(3, "d")}) + At("usleep(10000)", Later(20)),
     kNoStart + Video(10001, {}) + Audio(10001, {}, "null") + kRest + Video(1, {}) + Audio(10001, {}, "null") + kRest +
         Video(2, {}) + Audio(10001, {}, "null") + Calls{"log live/4 Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"sound alone keeps it alive, and a long pass that wrote is no time-out",
     Begins(Key(40, "K"), {{}, {}, {}}) + WithSound({Delta(8, "s")}) + At("UpdateStamp()", Later(15)),
     Started("K") + Video(40, {}, "null") + Audio(10001, WriteSound("s")) + NothingNew(40, 8) + kRest +
         NothingNew(40, 8) + Calls{"log live/4 Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"the time-out begins after the flush", Begins(Key(40, "K"), {Delta(41, "d")}) + At("fflush()", Later(21)),
     Started("K") + Video(40, WriteDelta("d")) + Audio(10001, {}, "null") + NothingNew(41, 10001) + kRest +
         Exit("1", "0")},
    {"failing output is logged for pictures of the loop only",
     kBoth + [](auto& p) { p.flush_fails = true, p.write_result = -1; },
     Started("KK") + Video(40, WriteDelta("ddd") + Calls{"log live/4 Failed to fflush data [Cam: 5, errno: 32]\n"}) +
         Audio(10001, WriteSound("s")) + NothingNew(41, 8) + kRest + Exit("1", "0")},
    {"traces each part at the highest level", kBoth + [](auto& p) { p.log_cfg.m_CategLevel[32] = 6; },
     Started("KK") +
         Video(40, Calls{WriteDelta("ddd")[0], "log live/6 Flush video frame. [FrameSize: 3]\n", "fflush()"}) +
         Audio(10001, WriteSound("s") + Calls{"log live/6 Flush latest audio. [FrameSize: 1]\n"}) + NothingNew(41, 8) +
         kRest + Exit("1", "0")},
};

TEST(MuxedLive, BeginsForwardsAndEnds) {
    for (const LoopRow& row : kRows) {
        RunLoop(row, "LiveviewMpeg4Cam", [](auto& handler) { handler.LiveviewMpeg4Cam(5, 51); });
    }
}

TEST(MuxedLive, SkipsSizesOutOfRangeWithoutTakingTheirNumber) {
    for (const SizeRow& row : kSizes) {
        SCOPED_TRACE(testing::Message() << row.length << " - " << row.offset);
        LiveView test;
        test.newest_key_frame = Key(40, "K");
        test.frames = {ScriptedFrame{41, "", row.offset, row.length}, {}};
        test.audio_frames = {ScriptedFrame{8, "", row.offset, row.length}};
        LiveHandler(test).LiveviewMpeg4Cam(5, 51);
        EXPECT_EQ(test.CallsOf(row.sent ? "ReadNext(41,position)" : "ReadNext(40,position)").size(),
                  row.sent ? 2U : 3U);
        EXPECT_EQ(test.CallsOf(row.sent ? "audio ReadNext(8,audio" : "audio ReadNext(10001,audio").size(),
                  row.sent ? 2U : 3U);
        EXPECT_EQ(test.CallsOf("Write(").size(), row.sent ? 3U : 1U);
    }
}

}  // namespace
