// SPDX-License-Identifier: Apache-2.0
//
// Playback: what a request reads, how it is answered, and how a session passes from player to player.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "test/unit/scripted_player.h"

using namespace lookhaven::test;

namespace {

const int kFlagsAtLoad = g_PlayerStop + g_PlayerCheckPid + g_PlayerPause;

TEST(Playback, SignalsSetTheFlags) {
    EXPECT_EQ(kFlagsAtLoad, 0);
    const Player player(kByIndex);
    ASSERT_TRUE(SetupPlayerSignals());
    for (const int pause : {1, 0, 1}) {
        std::raise(SIGUSR2);
        EXPECT_EQ(g_PlayerPause, pause);
    }
    EXPECT_EQ(g_PlayerStop + g_PlayerCheckPid, 0);
}

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
        player.broken_frames = {1};
        EXPECT_EQ(player.Run({}, 0), "");
        EXPECT_EQ(player.calls, Calls({"GetSessionID()", "GetAPIMethod()"}) + row.calls + Calls{"SetSuccess(null)"});
        EXPECT_EQ(PidFile(), "none");
    }
}

struct Outcome {
    std::string log;  // function: text, "@" for the handler's function
    const char* answer;
    bool redirect;
    std::string pid_file = "none";
};

struct FailureRow {
    const char* name;
    Change before;
    Outcome by_index, by_time;
    Change at_first_picture = Nothing;
};

TEST(Playback, FailuresHaveTheirAnswers) {
    const Outcome bad = {"@: Invalid input\n", "401", true}, forgiven = {"@: Invalid input\n", "ok", true};
    const Outcome signals = {"@: Failed to setup signal handler.\n", "400", false};
    const Outcome no_session = {"@: Failed to get session ID.\n", "400", true};
    const Outcome no_pid_file = {"@: Failed to write pid file.\n", "400", true};
    const Outcome silent = {"", "ok", true}, not_played = {"@: Failed to play event.\n", "ok", true};
    const std::string on_mount = "Failed to load event[3] on mount[0].\n", memory = "StreamOut: Alloc buffer failed!\n";
    const Outcome unknown = {"GetRecordedFilename: " + on_mount, "ok", true};
    const Outcome unknown_not_played = {unknown.log + not_played.log, "ok", true};
    const Change no_events = [](auto&p) { p.events.clear(); }, no_session_id = [](auto&p) { p.session_id = ""; };
    const auto fails = [](int signal) { return [=](ScriptedPlatform& p) { p.failing_signals = {signal}; }; };
    const FailureRow rows[] = {
        {"event 0, nor a signal", Params({{"eventid", 0}}) + fails(SIGTERM), bad, forgiven},
        {"negative start", Params({{"framestart", -1}, {"startTimeMS", -1}}), bad, forgiven},
        {"start of 32 bits", Params({{"framestart", INT_MIN}, {"startTimeMS", Json::Int64{1} << 31}}), bad, forgiven},
        {"no stream key", [](auto& p) { p.params.erase("timestamp"); }, bad, forgiven},
        {"negative stream key", Params({{"timestamp", -5}}), bad, forgiven},
        {"SIGTERM", fails(SIGTERM), signals, signals},
        {"SIGUSR1", fails(SIGUSR1), signals, signals},
        {"SIGUSR2, nor a session", no_session_id + fails(SIGUSR2), signals, signals},
        {"no session, nor an event", no_session_id + no_events, no_session, no_session},
        {"no place for a pid file, nor an event to flush",
         no_events + Params({{"flushHeader", 1}}) + [](auto& p) { p.session_id = kSession + "/x"; }, no_pid_file,
         no_pid_file},
        {"unknown event", no_events, unknown, unknown_not_played},
        {"unknown event to flush",
         no_events + Params({{"flushHeader", 1}}),
         unknown,
         {"@: " + on_mount, "400", false, std::to_string(getpid())}},
        {"unknown alert",
         no_events + Params({{"recEvtType", 1}}),
         {"GetAlertEventFilename: Failed to load event[3].\n", "ok", true},
         unknown_not_played},
        {"unknown POS event",
         no_events + Params({{"recEvtType", 2}}),
         {"GetPosEventFilename: Failed to load event[3].\n", "ok", true},
         unknown_not_played},
        {"quiet", no_events + [](auto& p) { p.log_cfg.m_CategLevel[68] = 0; }, silent, silent},
        {"nothing saved", [](auto& p) { p.events[3].m_blSaved = false; }, silent, not_played},
        {"no file", [](auto& p) { p.has_file = false; }, silent, not_played},
        {"no recording", [](auto& p) { p.init_result = -1; }, silent, not_played},
        {"no frame information", [](auto& p) { p.frame_info_result = -1; }, silent, not_played},
        {"frame rate 0", [](auto& p) { p.frame_rate = 0; }, silent, not_played},
        {"no memory",
         [](auto& p) { p.has_memory = false; },
         {memory, "ok", true},
         {memory + not_played.log, "ok", true}},
        {"start past the end", Frames(2) + Params({{"framestart", 2}, {"startTimeMS", 20}}), silent, not_played},
        {"pid file lost",
         Nothing,
         {"@: Fail to remove file. [" + kPidFile + "]\n", "ok", false},
         {"@: Failed to remove pid file.\n", "ok", false},
         [](auto&) { std::remove(kPidFile.c_str()); }},
    };
    for (const auto& row : rows) {
        for (const char* method : {kByIndex, kByTime}) {
            SCOPED_TRACE(std::string(method) + " " + row.name);
            const Outcome& expected = method == kByIndex ? row.by_index : row.by_time;
            const char* handler = method == kByIndex ? "HandlePlayEvent" : "HandlePlayEventNoFrameId";
            Player player(method);
            row.before(player);
            EXPECT_EQ(player.Run({{1, row.at_first_picture}}, 2), expected.redirect ? kRedirect : "");
            std::string text;
            for (const auto& log : player.logs) {
                EXPECT_EQ(log.file + " " + log.categ + log.level, "mjpegstreamer player1");
                text += (log.func == handler ? "@" : log.func) + ": " + log.text;
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

TEST(Playback, FollowsNothingThatWasPlantedInPlaceOfThePidFile) {
    const std::string victim = "/tmp/player_victim." + kSession;
    const std::pair<const char*, std::function<int()>> rows[] = {
        {"a link", [&] { return symlink(victim.c_str(), kPidFile.c_str()); }},
        {"another name of a file", [&] { return link(victim.c_str(), kPidFile.c_str()); }},
        {"a pipe", [] { return mkfifo(kPidFile.c_str(), 0600); }},
    };
    for (const auto& [name, plant] : rows) {
        SCOPED_TRACE(name);
        Player player(kByIndex);
        std::ofstream(victim) << getpid();
        ASSERT_EQ(plant(), 0);
        EXPECT_EQ(player.Run({}, 0), kRedirect);
        ASSERT_EQ(player.logs.size(), 1U);
        EXPECT_EQ(player.logs[0].text, "Failed to write pid file.\n");
        EXPECT_EQ(CheckPlayerPidFile(), -1);
        std::string kept;
        std::ifstream(victim) >> kept;
        EXPECT_EQ(kept, std::to_string(getpid()));
        std::remove(victim.c_str());
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
        Params({{"mountid", 7}, {"recEvtType", row.kind}, {"blAnalyEvent", row.is_analytics}})(player);
        player.Run({}, 1);
        EXPECT_EQ(player.CallsFrom("sigaction(12").at(1), row.load);
        EXPECT_EQ(player.Frames(), "0:P0 ");
    }
}

TEST(Playback, OnlyAGrowingEventIsFlushed) {
    struct Row {
        int flush, id;
        bool is_recording;
        int result;  // of making it playable
        Calls calls;
    };
    const Calls load = {"Event::Load(3,0,0,0)"};
    for (const Row& row :
         {Row{1, 3, true, 0, load + Calls{"DoEventTimelyPlay(3,0)"} + load},
          Row{1, 3, true, -1, load + Calls{"DoEventTimelyPlay(3,0)"} + load},
          Row{1, 1, true, 0, load + Calls{"DoEventTimelyPlay(1,0)"} + load}, Row{1, 3, false, 0, load + load},
          Row{1, 0, true, 0, load + load}, Row{2, 3, true, 0, load}, Row{0, 3, true, 0, load}}) {
        Player player(kByTime);
        player.params["flushHeader"] = row.flush;
        player.timely_play_result = row.result;
        player.events[3].m_Id = row.id;
        player.events[3].m_blRecording = row.is_recording;
        player.Run({}, 1);
        const Calls from = player.CallsFrom("Event::Load");
        EXPECT_EQ(Calls(from.begin(), std::find(from.begin(), from.end(), "IsFileExist(/rec/3)")), row.calls);
        EXPECT_EQ(player.Frames(), "P0 ");
    }
}

TEST(Playback, PassesTheSessionOn) {
    struct Row {
        const char* name;
        std::map<int, Change> plan;
        std::size_t pictures;
        const char* last;  // pattern of the stream's last call
        std::string pid_file;
    };
    const auto check = Signal(SIGUSR1);
    const Row rows[] = {
        {"still ours", {{2, check}}, 4, "ReadFrame.*", "none"},
        {"still ours, told after the last check", {{-4, check}}, 4, "ReadFrame.*", std::to_string(getpid())},
        {"a newer player's", {{2, [](auto&) { WritePidFile("1"); } + check}}, 2, "ReadFrame.*", "1"},
        {"nobody's", {{2, [](auto&) { WritePidFile("x"); } + check}}, 2, "ReadFrame.*", "x"},
        {"gone", {{2, [](auto&) { std::remove(kPidFile.c_str()); } + check}}, 2, "Get.*|Set.*", "none"},
        {"a newer player's, untold", {{2, [](auto&) { WritePidFile("1"); }}}, 4, "ReadFrame.*", "none"},
    };
    const Change modes[] = {Nothing, Params({{"changerate", 1}}), Params({{"interval", 0}})};
    for (const auto& row : rows) {
        for (int mode = 0; mode < 6; ++mode) {
            SCOPED_TRACE(row.name + std::to_string(mode));
            Player player(mode < 3 ? kByIndex : kByTime);
            modes[mode % 3](player);
            if (row.plan.begin()->first < 0 && mode % 3 == 2) {
                continue;  // sampling has no wait
            }
            WritePidFile("older player");
            std::string at_start;
            std::map<int, Change> plan = row.plan;
            plan[1] = [&](auto&) { at_start = PidFile(); };
            EXPECT_EQ(player.Run(plan, 4), "");
            EXPECT_EQ(at_start, std::to_string(getpid()));
            const std::string frames = player.Frames();
            EXPECT_EQ(static_cast<std::size_t>(std::count(frames.begin(), frames.end(), ' ')), row.pictures);
            EXPECT_THAT(player.calls.at(player.calls.size() - 2), testing::MatchesRegex(row.last));
            EXPECT_EQ(PidFile(), row.pid_file);
            EXPECT_TRUE(player.logs.empty());
        }
    }
}

}  // namespace
