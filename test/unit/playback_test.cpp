// SPDX-License-Identifier: Apache-2.0
//
// Playback: what a request reads and gets, which frames each loop sends, how a session passes from player to player.
#include <climits>
#include <cmath>
#include <fstream>
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"
#include "test/support/platform/scripted_platform.h"

using lookhaven::test::Calls;
using lookhaven::test::MakeEvent;
using lookhaven::test::ScriptedPlatform;
using lookhaven::test::StdoutCapture;
using Script = std::function<void(ScriptedPlatform&)>;

namespace {

using lookhaven::test::operator+;

const char* const kByIndex = "PlayMjpegEvent";
const char* const kByTime = "PlayMjpegEventNoFrameId";
const std::string kSession = "unit" + std::to_string(getpid());
const std::string kPidFile = "/tmp/player_src.pid." + kSession;
constexpr char kRedirect[] =
    "Location: /webman/3rdparty/Lookhaven/resources/images/2x/components/icon_indicator_warning.png\r\n\r\n";

void WritePidFile(const std::string& text) {
    std::ofstream(kPidFile) << text;
}

// The file's text, "none" without one.
std::string PidFile() {
    std::ifstream file(kPidFile);
    std::ostringstream text;
    text << file.rdbuf();
    return file ? text.str() : "none";
}

// A request to play event 3, of 100 frames at 10 fps, as stream 5.
struct Player {
    explicit Player(const char* method) {
        g_PlayerStop = g_PlayerCheckPid = g_PlayerPause = 0;
        platform.method = method;
        platform.session_id = kSession;
        platform.log_cfg.m_CategLevel[LOG_CATEG_PLAYER] = LOG_LEVEL_ERR;
        platform.events[3] = MakeEvent(3, 100, 110);
        platform.params = {{"eventid", 3}, {"timestamp", 5}};
    }
    ~Player() { std::remove(kPidFile.c_str()); }

    // What standard output got. At a picture's number, counted from 1, happens what is planned for it; 0: before the
    // first. SIGTERM comes at the last one.
    std::string Run(const std::map<int, Script>& plan, int last_picture) {
        int pictures = 0;
        platform.on_call = [&](const std::string& call) {
            const bool is_picture = call.rfind("Write(image/jpeg", 0) == 0;
            pictures += is_picture;
            const auto planned = plan.find(pictures);
            if ((is_picture || call == "BeginTiming()") && planned != plan.end()) {
                planned->second(platform);
            }
            if (is_picture && pictures == last_picture) {
                std::raise(SIGTERM);
            }
        };
        StdoutCapture capture;
        platform.calls.clear();
        MjpegStreamHandler(platform.Request(), platform.Response()).HandleProcess();
        calls = platform.calls;  // before the capture's own flush
        return capture.Text();
    }

    // What stands between the text and the next comma or bracket in each call that begins with it, joined.
    std::string All(const std::string& text) const {
        std::string all;
        for (const auto& call : calls) {
            if (call.rfind(text, 0) == 0) {
                all += call.substr(text.size(), call.find_first_of(",)", text.size()) - text.size()) + " ";
            }
        }
        return all;
    }

    // What was sent: 4:P4 for a picture behind its index, P4 for one without.
    std::string Frames() const {
        std::string frames;
        for (const auto& call : calls) {
            if (call.rfind("Write(text/plain,", 0) == 0) {
                frames += call.substr(17, call.find("\r\n,") - 17) + ":";
            } else if (call.rfind("Write(image/jpeg,", 0) == 0) {
                frames += call.substr(17, call.find(',', 17) - 17) + " ";
            }
        }
        return frames;
    }

    ScriptedPlatform platform;
    Calls calls;
};

Script Params(const std::map<std::string, Json::Value>& params) {
    return [params](ScriptedPlatform& p) {
        for (const auto& [name, value] : params) {
            p.params[name] = value;
        }
    };
}
Script Frames(int count) {
    return [count](ScriptedPlatform& p) { p.frame_count = count; };
}
Script ClientSets(int number) {
    return [number](ScriptedPlatform& p) { p.client_number = number; };
}
Script Signal(int signal) {
    return [signal](ScriptedPlatform&) { std::raise(signal); };
}
Script operator+(const Script& first, const Script& second) {
    return [=](ScriptedPlatform& p) { first(p), second(p); };
}
void Nothing(ScriptedPlatform&) {}

const Calls kSignals = {"sigaction(15,0,no mask)", "sigaction(10,0,no mask)", "sigaction(12,0,no mask)"};
const Calls kOpen = {"Event::Load(3,0,0,0)", "IsFileExist(/rec/3)", "ProgressIndicator(5,1,1)",
                     "DelayTimer(0)",        "Init(/rec/3)",        "GetFrameInfo()"};
const Calls kPace = {"SetDelayTime(100000)", "BeginTiming()"};
const Calls kPicture = {"Write(image/jpeg,P0,2,null)", "fflush()"};

TEST(Playback, ReadsAndCallsInOrder) {
    struct Row {
        const char* method;
        Calls calls;
    };
    const Row rows[] = {
        {kByIndex, Calls{"GetParam(mountid,\"0\")", "GetParam(eventid,\"0\")", "GetParam(framestart,\"0\")",
                         "GetParam(framestop,\"-1\")", "GetParam(playrate,\"1\")", "GetParam(interval,\"-1\")",
                         "GetParam(timestamp,\"0\")", "GetParam(blAnalyEvent,false)", "GetParam(recEvtType,0)"} +
                       kSignals + kOpen + Calls{"ReadFrame(0,2097152)", "Set(1)"} + kPace +
                       Calls{"Write(text/plain,0\r\n,3,null)", "fflush()"} + kPicture +
                       Calls{"Get()", "Delay()", "ReadFrame(1,2097152)"}},
        {kByTime, Calls{"GetParam(mountid,0)", "GetParam(eventid,0)", "GetParam(startTimeMS,0)",
                        "GetParam(stopTimeMS,-1)", "GetParam(playrate,1)", "GetParam(changerate,0)",
                        "GetParam(interval,-1)", "GetParam(flushHeader,0)", "GetParam(timestamp,0)"} +
                      kSignals + kOpen + Calls{"GetFrameIdx(0)", "GetFrameIdx(-1)", "ReadFrame(0,2097152)"} + kPace +
                      kPicture + Calls{"Set(0)", "Delay()", "ReadFrame(0,2097152)"} + kPicture +
                      Calls{"Set(10)", "Delay()", "ReadFrame(1,2097152)"}},
    };
    for (const auto& row : rows) {
        Player player(row.method);
        player.platform.broken_frames = {1};
        EXPECT_EQ(player.Run({}, 0), "");
        EXPECT_EQ(player.calls, Calls({"GetSessionID()", "GetAPIMethod()"}) + row.calls + Calls{"SetSuccess(null)"});
        EXPECT_EQ(PidFile(), "none");
    }
}

struct FramesRow {
    const char* name;
    const char* method;
    Script before;
    std::map<int, Script> plan;
    std::string frames;  // the stream is stopped at the fifth picture unless it ends before
};

const FramesRow kFrames[] = {
    {"the last stands", kByIndex, Frames(3), {}, "0:P0 1:P1 2:P2 2:P2 2:P2 "},
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
    {"paused in the midst", kByTime, Params({{"startTimeMS", 70}}), {{3, Signal(SIGUSR2)}}, "P7 P7 P8 P8 P8 "},
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

struct Outcome {
    std::string log;
    const char* answer;
    bool redirect;
    std::string pid_file = "none";
};

struct FailureRow {
    const char* name;
    Script before;
    Outcome by_index, by_time;
    Script at_first_picture = Nothing;
};

TEST(Playback, FailuresHaveTheirAnswers) {
    const Outcome bad = {"Invalid input\n", "401", true}, forgiven = {"Invalid input\n", "ok", true};
    const Outcome signals = {"Failed to setup signal handler.\n", "400", false};
    const Outcome silent = {"", "ok", true}, not_played = {"Failed to play event.\n", "ok", true};
    const std::string unknown = "Failed to load event[3] on mount[0].\n", memory = "Alloc buffer failed!\n";
    const Outcome no_session = {"Failed to get session ID.\n", "400", true};
    const Outcome no_pid_file = {"Failed to write pid file.\n", "400", true};
    const FailureRow rows[] = {
        {"event 0", Params({{"eventid", 0}}), bad, forgiven},
        {"start before the begin", Params({{"framestart", -1}, {"startTimeMS", -1}}), bad, forgiven},
        {"start beyond 31 bits", Params({{"framestart", INT_MIN}, {"startTimeMS", Json::Int64{1} << 31}}), bad,
         forgiven},
        {"no stream key", [](auto& p) { p.params.erase("timestamp"); }, bad, forgiven},
        {"negative stream key", Params({{"timestamp", -5}}), bad, forgiven},
        {"SIGTERM", [](auto& p) { p.failing_signals = {SIGTERM}; }, signals, signals},
        {"SIGUSR1", [](auto& p) { p.failing_signals = {SIGUSR1}; }, signals, signals},
        {"SIGUSR2", [](auto& p) { p.failing_signals = {SIGUSR2}; }, signals, signals},
        {"no session", [](auto& p) { p.session_id = ""; }, no_session, no_session},
        {"no place for a pid file", [](auto& p) { p.session_id = kSession + "/x"; }, no_pid_file, no_pid_file},
        {"unknown event",
         [](auto& p) { p.events.clear(); },
         {unknown, "ok", true},
         {unknown + not_played.log, "ok", true}},
        {"unknown event to flush",
         [](auto& p) { p.events.clear(), p.params["flushHeader"] = 1; },
         {unknown, "ok", true},
         {unknown, "400", false, std::to_string(getpid())}},
        {"nothing saved", [](auto& p) { p.events[3].m_blSaved = false; }, silent, not_played},
        {"no file", [](auto& p) { p.has_file = false; }, silent, not_played},
        {"no recording", [](auto& p) { p.init_result = 1; }, silent, not_played},
        {"no frame information", [](auto& p) { p.frame_info_result = 1; }, silent, not_played},
        {"frame rate 0", [](auto& p) { p.frame_rate = 0; }, silent, not_played},
        {"no memory",
         [](auto& p) { p.has_memory = false; },
         {memory, "ok", true},
         {memory + not_played.log, "ok", true}},
        {"start past the end", Frames(2) + Params({{"framestart", 2}, {"startTimeMS", 20}}), silent, not_played},
        {"pid file lost",
         Nothing,
         {"Fail to remove file. [" + kPidFile + "]\n", "ok", false},
         {"Failed to remove pid file.\n", "ok", false},
         [](auto&) { std::remove(kPidFile.c_str()); }},
    };
    for (const auto& row : rows) {
        for (const char* method : {kByIndex, kByTime}) {
            SCOPED_TRACE(std::string(method) + " " + row.name);
            const Outcome& expected = method == kByIndex ? row.by_index : row.by_time;
            Player player(method);
            row.before(player.platform);
            EXPECT_EQ(player.Run({{1, row.at_first_picture}}, 2), expected.redirect ? kRedirect : "");
            std::string text;
            for (const auto& log : player.platform.logs) {
                EXPECT_EQ(log.file + " " + log.categ, "mjpegstreamer player");
                text += log.text;
            }
            EXPECT_EQ(text, expected.log);
            const std::string answer = expected.answer;
            EXPECT_EQ(player.calls.back(), answer == "ok"
                                               ? "SetSuccess(null)"
                                               : "SetError(" + answer + ",{\"param1\":\"\",\"param2\":\"\"})");
            EXPECT_EQ(PidFile(), expected.pid_file);
        }
    }
}

TEST(Playback, LogLinesNameTheirFunctions) {
    struct Row {
        const char* method;
        Script before;
        std::vector<std::string> functions;
    };
    const auto lose = [](ScriptedPlatform& p) { p.events.clear(); };
    const Row rows[] = {
        {kByIndex, Params({{"eventid", 0}}), {"HandlePlayEvent"}},
        {kByIndex, [](auto& p) { p.session_id = ""; }, {"HandlePlayEvent"}},
        {kByTime, [](auto& p) { p.session_id = ""; }, {"HandlePlayEventNoFrameId"}},
        {kByTime, lose, {"GetRecordedFilename", "HandlePlayEventNoFrameId"}},
        {kByIndex, lose + Params({{"recEvtType", 1}}), {"GetAlertEventFilename"}},
        {kByIndex, lose + Params({{"recEvtType", 2}}), {"GetPosEventFilename"}},
        {kByIndex, [](auto& p) { p.has_memory = false; }, {"StreamOut"}},
        {kByIndex, lose + [](auto& p) { p.log_cfg.m_CategLevel[LOG_CATEG_PLAYER] = 0; }, {}},
    };
    for (const auto& row : rows) {
        Player player(row.method);
        row.before(player.platform);
        player.Run({}, 1);
        std::vector<std::string> functions;
        for (const auto& log : player.platform.logs) {
            functions.push_back(log.func);
        }
        EXPECT_EQ(functions, row.functions);
    }
}

TEST(Playback, KindDecidesTheRecord) {
    struct Row {
        int kind;
        bool is_analytics;
        const char* load;
    };
    for (const Row& row : {Row{0, false, "Event::Load(3,7,0,0)"}, Row{0, true, "AlertEvent::Load(3,0,0,0)"},
                           Row{1, false, "AlertEvent::Load(3,0,0,0)"}, Row{2, true, "PosEvent::Load(3,0,0,0)"},
                           Row{9, true, "Event::Load(3,7,0,0)"}}) {
        SCOPED_TRACE(row.load);
        Player player(kByIndex);
        Params({{"mountid", 7}, {"recEvtType", row.kind}, {"blAnalyEvent", row.is_analytics}})(player.platform);
        player.Run({}, 1);
        EXPECT_EQ(player.platform.CallsFrom("sigaction(12").at(1), row.load);
        EXPECT_EQ(player.Frames(), "0:P0 ");
    }
}

TEST(Playback, OnlyAGrowingEventIsFlushed) {
    struct Row {
        int flush, id;
        bool is_recording;
        Calls calls;
    };
    const Calls load = {"Event::Load(3,0,0,0)"};
    for (const Row& row :
         {Row{1, 3, true, load + Calls{"DoEventTimelyPlay(3,0)"} + load}, Row{1, 3, false, load + load},
          Row{1, 0, true, load + load}, Row{2, 3, true, load}, Row{0, 3, true, load}}) {
        Player player(kByTime);
        player.platform.params["flushHeader"] = row.flush;
        player.platform.events[3].m_Id = row.id;
        player.platform.events[3].m_blRecording = row.is_recording;
        player.Run({}, 1);
        const Calls from = player.platform.CallsFrom("Event::Load");
        EXPECT_EQ(Calls(from.begin(), std::find(from.begin(), from.end(), "IsFileExist(/rec/3)")), row.calls);
    }
}

TEST(Playback, PassesTheSessionOn) {
    struct Row {
        const char* name;
        Script at_second;
        std::size_t pictures;
        const char* last;  // the stream's last call
        const char* pid_file;
    };
    const auto check = Signal(SIGUSR1);
    const Row rows[] = {
        {"still ours", check, 4, "ReadFrame", "none"},
        {"a newer player's", [](auto&) { WritePidFile("1"); } + check, 2, "ReadFrame", "1"},
        {"nobody's", [](auto&) { WritePidFile("x"); } + check, 2, "ReadFrame", "x"},
        {"gone", [](auto&) { std::remove(kPidFile.c_str()); } + check, 2, "Get", "none"},
        {"a newer player's, untold", [](auto&) { WritePidFile("1"); }, 4, "ReadFrame", "none"},
    };
    for (const auto& row : rows) {
        for (const char* method : {kByIndex, kByTime}) {
            SCOPED_TRACE(std::string(method) + " " + row.name);
            Player player(method);
            player.platform.params["changerate"] = 1;
            WritePidFile("older player");
            std::string at_start;
            EXPECT_EQ(player.Run({{1, [&](auto&) { at_start = PidFile(); }}, {2, row.at_second}}, 4), "");
            EXPECT_EQ(at_start, std::to_string(getpid()));
            const std::string frames = player.Frames();
            EXPECT_EQ(static_cast<std::size_t>(std::count(frames.begin(), frames.end(), ' ')), row.pictures);
            EXPECT_THAT(player.calls.at(player.calls.size() - 2), testing::StartsWith(row.last));
            EXPECT_EQ(PidFile(), row.pid_file);
            EXPECT_TRUE(player.platform.logs.empty());
        }
    }
}

}  // namespace
