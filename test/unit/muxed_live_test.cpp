// SPDX-License-Identifier: Apache-2.0
//
// The muxed live stream: where it begins, what it forwards and skips, how it ends.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "player/liveview_src/liveview_src.h"
#include "test/support/platform/scripted_platform.h"

using lookhaven::test::Calls;
using lookhaven::test::operator+;
using lookhaven::test::ScriptedFrame;
using lookhaven::test::ScriptedPlatform;
using Script = std::function<void(ScriptedPlatform&)>;

namespace {

struct ProbeHandler : LiveviewSrcHandler {
    explicit ProbeHandler(ScriptedPlatform& platform) : LiveviewSrcHandler(platform.Request(), platform.Response()) {}
    using LHWebAPIHandler::m_ErrCode;
};

struct Row {
    const char* name;
    Script before;
    const char* at;  // the call at which then happens, each time
    Script then;
    Calls calls;  // from the first StartRead on
};

ScriptedFrame Key(int seq, const std::string& data) {
    return {seq, data, 0, -1, true, 0x500000001LL};
}
ScriptedFrame Delta(int seq, const std::string& data) {
    return {seq, data, 0, -1, false, 7};
}

const Calls kOpen = {"StartRead()", "audio StartRead()", "ReadLatestIFrame()"};
const Calls kNoStart = kOpen + Calls{"ReadIFrameFinish(null,null)"};
const Calls kUpdate = {"GetVdoExtraData(1024)", "audio GetAdoExtraData(1024)"};
const Calls kClose = {"StopRead()", "audio StopRead()", "shmdt()", "audio shmdt()", "SetEnableOutput(0)"};

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
// The two halves of a pass around what is written.
Calls Video(int seq, const Calls& written, const char* entry = "entry") {
    return Calls{"UpdateStamp()", "ReadNext(" + std::to_string(seq) + ",position)"} + written +
           Calls{std::string("ReadFinish(") + entry + ",1,position)"};
}
Calls Audio(int seq, const Calls& written, const char* entry = "entry") {
    return Calls{"audio ReadNext(" + std::to_string(seq) + ",audio position)"} + written +
           Calls{std::string("audio ReadFinish(") + entry + ",0,audio position)"};
}
Calls Nothing(int video, int audio) {
    return Video(video, {}, "null") + Audio(audio, {}, "null");
}
const Calls kRest = {"usleep(10000)"};
Calls Exit(const std::string& eof, const std::string& stop) {
    return Calls{"log Exit loop [Cam: 5, feof: " + eof + ", ferror: 0, gblStop: " + stop + "]\n"} + kClose;
}
Calls Started(const std::string& data) {
    return kOpen + kUpdate + WriteKey(data) +
           Calls{"log Flush latest i-frame. [FrameSize: " + std::to_string(data.size()) + "]\n",
                 "ReadIFrameFinish(entry,null)"};
}

void Leave(ScriptedPlatform&) {}
void Stop(ScriptedPlatform&) {
    gblStop = 1;
}

const Row kRows[] = {
    {"begins with the newest key frame and forwards both media without a rest",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames = {Delta(41, "d"), {}, Delta(0, "e")};
         p.audio_frames = {Delta(8, "s"), Delta(9, "t")};
     },
     "", Leave,
     Started("K") + Video(40, WriteDelta("d")) + Audio(10001, WriteSound("s")) + Video(41, {}, "null") +
         Audio(8, WriteSound("t")) + Video(41, WriteDelta("e")) + Audio(9, {}, "null") + Nothing(0, 9) + kRest +
         Exit("1", "0")},
    {"without one waits, dropping sound and frames that need an earlier one, whose numbers it takes",
     [](auto& p) {
         p.frames = {Delta(3, "d"), Key(4, "K")};
         p.audio_frames = {Delta(1, "s"), Delta(2, "t")};
     },
     "", Leave,
     kNoStart + Video(10001, {}) + Audio(10001, {}) + kRest + Video(3, kUpdate + WriteKey("K")) +
         Audio(1, WriteSound("t")) + Nothing(4, 2) + kRest + Exit("1", "0")},
    {"an empty start frame is none",
     [](auto& p) {
         p.newest_key_frame = Key(40, "");
         p.frames = {Key(41, "K")};
     },
     "", Leave,
     kOpen + Calls{"ReadIFrameFinish(entry,null)"} + Video(10001, kUpdate + WriteKey("K")) + Audio(10001, {}, "null") +
         Nothing(41, 10001) + kRest + Exit("1", "0")},
    {"describes the stream as at its first key frame",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames = {Key(41, "L")};
     },
     "ReadIFrameFinish(entry,null)", [](auto& p) { p.video_codec = p.audio_codec = p.video_extra = "other"; },
     Started("K") + Video(40, WriteKey("L")) + Audio(10001, {}, "null") + Nothing(41, 10001) + kRest + Exit("1", "0")},
    {"stopped between picture and sound",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames = {Delta(41, "d")};
     },
     "ReadFinish(entry,1,position)", Stop, Started("K") + Video(40, WriteDelta("d")) + Exit("0", "1")},
    {"stopped before the first pass", Stop, "", Leave, kNoStart + Exit("0", "1")},
    {"paused, then on", [](auto& p) { p.common_cfg.m_blPause = 1; }, "sleep(10)",
     [](auto& p) { p.common_cfg.m_blPause = 0; },
     kNoStart + Calls{"sleep(10)"} + Nothing(10001, 10001) + kRest + Exit("1", "0")},
    {"dropped frames keep no stream alive",
     [](auto& p) {
         p.frames = {Delta(1, "d"), Delta(2, "d"), Delta(3, "d")};
     },
     "usleep(10000)", [](auto& p) { p.now += 20; },
     kNoStart + Video(10001, {}) + Audio(10001, {}, "null") + kRest + Video(1, {}) + Audio(10001, {}, "null") + kRest +
         Video(2, {}) + Audio(10001, {}, "null") + Calls{"log Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"sound alone keeps it alive, and a long pass that wrote is no time-out",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames.resize(3);
         p.audio_frames = {Delta(8, "s")};
     },
     "UpdateStamp()", [](auto& p) { p.now += 15; },
     Started("K") + Video(40, {}, "null") + Audio(10001, WriteSound("s")) + Nothing(40, 8) + kRest + Nothing(40, 8) +
         Calls{"log Timeeout [Cam: 5]\n"} + Exit("0", "0")},
    {"a failing flush is logged for pictures of the loop only",
     [](auto& p) {
         p.newest_key_frame = Key(40, "K");
         p.frames = {Delta(41, "d")};
         p.audio_frames = {Delta(8, "s")};
         p.flush_fails = true;
     },
     "", Leave,
     Started("K") + Video(40, WriteDelta("d") + Calls{"log Failed to fflush data [Cam: 5, errno: 32]\n"}) +
         Audio(10001, WriteSound("s")) + Nothing(41, 8) + kRest + Exit("1", "0")},
};

class MuxedLive : public testing::Test {
  protected:
    MuxedLive() {
        gblStop = 0;
        platform_.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 5;
    }
    ~MuxedLive() override { gblStop = 0; }

    ScriptedPlatform platform_;
};

TEST(MuxedLiveLoop, BeginsForwardsAndEnds) {
    for (const Row& row : kRows) {
        SCOPED_TRACE(row.name);
        gblStop = 0;
        ScriptedPlatform platform;
        platform.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 5;
        row.before(platform);
        platform.on_call = [&](const std::string& call) {
            if (call == row.at) {
                row.then(platform);
            }
        };
        ProbeHandler handler(platform);
        handler.LiveviewMpeg4Cam(5, 51);
        EXPECT_EQ(platform.CallsFrom("StartRead"), row.calls);
        EXPECT_EQ(handler.m_ErrCode, 0);
        for (const auto& log : platform.logs) {
            EXPECT_EQ(log.file + " " + log.func, "liveview_src LiveviewMpeg4Cam");
        }
    }
    gblStop = 0;
}

TEST_F(MuxedLive, NeedsBothRings) {
    const Calls attach = {"StartLive(5,51)", "LiveStreamFifoAt(5,51)"};
    platform_.has_audio_stream = false;
    ProbeHandler without_sound(platform_);
    without_sound.LiveviewMpeg4Cam(5, 51);
    EXPECT_EQ(without_sound.m_ErrCode, 400);
    const Calls no_sound = {"LiveAdoStreamFifoAt(5,51)", "log Cam[5]: Failed to attach live audio stream [51].\n"};
    EXPECT_EQ(platform_.calls, attach + no_sound);
    platform_.calls.clear();
    platform_.has_stream = false;
    ProbeHandler without_picture(platform_);
    without_picture.LiveviewMpeg4Cam(5, 51);
    EXPECT_EQ(without_picture.m_ErrCode, 400);
    const Calls no_picture = {"log Cam[5]: Failed to attach live stream [51].\n"};
    EXPECT_EQ(platform_.calls, attach + no_picture);
}

TEST_F(MuxedLive, SkipsSizesOutOfRangeWithoutTakingTheirNumber) {
    struct Size {
        int length, offset;
        bool sent;
    };
    for (const Size& size : {Size{0, 0, false}, Size{9, 9, false}, Size{1, 0, true}, Size{4194303 + 4, 4, true},
                             Size{4194304, 0, false}}) {
        SCOPED_TRACE(testing::Message() << size.length << " - " << size.offset);
        platform_.newest_key_frame = Key(40, "K");
        platform_.frames = {ScriptedFrame{41, "", size.offset, size.length}, {}};
        platform_.audio_frames = {ScriptedFrame{8, "", size.offset, size.length}};
        platform_.calls.clear();
        platform_.is_eof = false;
        ProbeHandler(platform_).LiveviewMpeg4Cam(5, 51);
        EXPECT_THAT(
            platform_.calls,
            testing::Contains(size.sent ? "ReadNext(41,position)" : "ReadNext(40,position)").Times(size.sent ? 2 : 3));
        EXPECT_THAT(platform_.calls, testing::Contains(size.sent ? "audio ReadNext(8,audio position)"
                                                                 : "audio ReadNext(10001,audio position)")
                                         .Times(size.sent ? 2 : 3));
        EXPECT_THAT(platform_.calls, testing::Contains(testing::StartsWith("Write(")).Times(size.sent ? 3 : 1));
    }
}

TEST_F(MuxedLive, TracesEachPartAtTheHighestLevel) {
    platform_.log_cfg.m_CategLevel[LOG_CATEG_LIVEVIEW] = 6;
    platform_.newest_key_frame = Key(40, "KK");
    platform_.frames = {Delta(41, "ddd")};
    platform_.audio_frames = {Delta(8, "s")};
    ProbeHandler(platform_).LiveviewMpeg4Cam(5, 51);
    Calls lines;
    for (const auto& log : platform_.logs) {
        lines.push_back(log.level + " " + log.text);
    }
    EXPECT_THAT(lines, testing::ElementsAre(
                           "info Flush latest i-frame. [FrameSize: 2]\n", "debug Flush video frame. [FrameSize: 3]\n",
                           "debug Flush latest audio. [FrameSize: 1]\n", testing::StartsWith("info Exit")));
}

}  // namespace
