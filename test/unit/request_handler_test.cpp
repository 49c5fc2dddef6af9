// SPDX-License-Identifier: Apache-2.0
//
// The module's table and entry functions, the handler base, and the filter of its log.
#include <cstring>
#include <stdexcept>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "test/support/platform/scripted_platform.h"
#include "webapi/include/lhwebapihandler.h"
#include "webapi/lookhaven_player.h"

using lookhaven::test::Calls;
using lookhaven::test::operator+;
using lookhaven::test::ScriptedPlatform;
using testing::ElementsAre;

namespace {

struct ProbeHandler : LHHandlerBase<ProbeHandler> {
    explicit ProbeHandler(ScriptedPlatform& platform) : LHWebAPIHandler(platform.Request(), platform.Response()) {}
    using LHWebAPIHandler::Answer;
    using LHWebAPIHandler::Authenticate;
    using LHWebAPIHandler::GetPrivProfile;
    using LHWebAPIHandler::m_bPairAuth;
    using LHWebAPIHandler::m_bRelayed;
    using LHWebAPIHandler::m_Mutex;
    using LHWebAPIHandler::SetErrorCode;
};

const Calls kSession = {"IsAuthorized()", "HasAppPriv(VEXO.VDX.Lookhaven)", "IsAdmin()", "GetLoginUserName()"};
const Calls kAppPriv = {kSession.begin(), kSession.begin() + 2};
const Calls kAdmin = {kSession.begin(), kSession.begin() + 3};
const Calls kPairedHost = {"IsLHRunning()", "GetParam(isCrossSite,0)", "GetParam(client,\"\")"};
const Calls kPair = {"GetParam(cookie,\"FailedCookie\")", "GetCookie(timestamp,FailedTiemstamp)"};
const Calls kNoSession = {"IsAuthorized()"};

Calls UserPriv(const std::string& user) {
    return {"GetRemoteIP()", "AppPrivUserHas(" + user + ",VEXO.VDX.Lookhaven,192.0.2.9)"};
}

struct AdmissionRow {
    const char* name;
    std::function<void(ScriptedPlatform&)> script;
    bool admitted;
    Calls calls;
};

void AsPairedHost(ScriptedPlatform& p, const char* client) {
    p.params = {{"client", client}, {"cookie", "c"}};
    p.cookies["timestamp"] = "t";
    p.pair_matches = true;
}

const AdmissionRow kAdmission[] = {
    {"application privilege", [](auto& p) { p.is_authorized = p.has_app_priv = true; }, true, kAppPriv},
    {"administrator", [](auto& p) { p.is_authorized = p.is_admin = true; }, true, kAdmin},
    {"the service's own account", [](auto& p) { p.is_authorized = true, p.user_name = "Lookhaven"; }, true, kSession},
    {"the user's privilege", [](auto& p) { p.is_authorized = p.has_user_priv = true; }, true,
     kSession + UserPriv("eve")},
    {"session without rights", [](auto& p) { p.is_authorized = true, p.user_name = "lookhaven"; }, false,
     kSession + UserPriv("lookhaven") + kPairedHost},
    {"session without rights, but a paired host", [](auto& p) { p.is_authorized = true, AsPairedHost(p, "MX510LQ"); },
     true, kSession + UserPriv("eve") + kPairedHost + kPair + Calls{"IsAuthPairMatch(c,t)"}},
    {"rights without a session", [](auto& p) { p.has_app_priv = p.is_admin = p.has_user_priv = true; }, false,
     kNoSession + kPairedHost},
    {"client in other letters", [](auto& p) { AsPairedHost(p, "nvr"); }, false, kNoSession + kPairedHost},
    {"service down", [](auto& p) { AsPairedHost(p, "NVR"), p.is_running = false; }, false, kNoSession + kPairedHost},
    {"empty cookie", [](auto& p) { AsPairedHost(p, "NVR"), p.params["cookie"] = ""; }, false,
     kNoSession + kPairedHost + kPair},
    {"empty timestamp", [](auto& p) { AsPairedHost(p, "NVR"), p.cookies["timestamp"] = ""; }, false,
     kNoSession + kPairedHost + kPair},
    {"no cookies at all", [](auto& p) { p.params["client"] = "NVR"; }, false,
     kNoSession + kPairedHost + kPair + Calls{"IsAuthPairMatch(FailedCookie,FailedTiemstamp)"}},
    {"across sites", [](auto& p) { AsPairedHost(p, "REC_SERVER"), p.params["isCrossSite"] = 1; }, true,
     kNoSession + kPairedHost + kPair + Calls{"SlaveHxAuthentication()", "IsAuthByPairMatch(c,t)"}},
    {"across sites, no match",
     [](auto& p) { AsPairedHost(p, "REC_SERVER"), p.params["isCrossSite"] = 1, p.pair_matches = false; }, false,
     kNoSession + kPairedHost + kPair + Calls{"SlaveHxAuthentication()", "IsAuthByPairMatch(c,t)"}},
    {"isCrossSite 2", [](auto& p) { AsPairedHost(p, "NVR"), p.params["isCrossSite"] = 2; }, true,
     kNoSession + kPairedHost + kPair + Calls{"IsAuthPairMatch(c,t)"}},
};

TEST(Authenticate, AsksInOrderAndNoMoreThanItNeeds) {
    for (const auto& row : kAdmission) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        row.script(platform);
        ProbeHandler handler(platform);
        EXPECT_EQ(handler.Authenticate(), row.admitted);
        EXPECT_EQ(platform.calls, row.calls);
        EXPECT_EQ(handler.m_bPairAuth, row.admitted && row.calls.back().find("Pair") != std::string::npos);
    }
}

TEST(PrivProfile, IsLoadedOnceForTheLoginOrForAPairedHost) {
    for (const bool is_paired_host : {false, true}) {
        ScriptedPlatform platform;
        platform.params["privData"]["privilege"] = 3;
        ProbeHandler handler(platform);
        handler.m_bPairAuth = is_paired_host;
        PrivProfile* const profile = handler.GetPrivProfile();
        EXPECT_EQ(profile->GetPrivilege(), 3) << "narrowed from 2";
        EXPECT_EQ(handler.GetPrivProfile(), profile);
        const Calls load = {"GetParam(privData,null)", "UpdateByJson({\"privilege\":3})"};
        EXPECT_EQ(platform.calls, (is_paired_host ? Calls{"PrivProfileGetByUid(1024)"}
                                                  : Calls{"GetLoginUID()", "PrivProfileGetByUid(7)"}) +
                                      load);
    }
}

TEST(PrivProfile, ExceptionLeavesTheMutexFree) {
    ScriptedPlatform platform;
    platform.on_call = [](const std::string& call) {
        if (call == "UpdateByJson(null)") {
            throw std::runtime_error("store");
        }
    };
    ProbeHandler handler(platform);
    platform.watched_mutex = &handler.m_Mutex;
    EXPECT_THROW(handler.GetPrivProfile(), std::runtime_error);
    EXPECT_EQ(platform.calls.front(), "lock");
    EXPECT_EQ(platform.calls.back(), "unlock");
}

TEST(PrivProfile, DiesBeforeTheMutexThatWaitsForItsUser) {
    ScriptedPlatform platform;
    {
        ProbeHandler handler(platform);
        handler.GetPrivProfile();
        platform.watched_mutex = &handler.m_Mutex;
        platform.calls.clear();
    }
    EXPECT_THAT(platform.calls, ElementsAre("free profile", "lock", "unlock", "destroy"));
}

TEST(Answer, GivesTheLastErrorElseTheData) {
    ScriptedPlatform platform;
    ProbeHandler handler(platform);
    handler.Answer("fine");
    handler.SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "a", "b");
    handler.Answer("fine");
    handler.SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
    handler.Answer("fine");
    EXPECT_THAT(platform.calls, ElementsAre("SetSuccess(\"fine\")", "SetError(400,{\"param1\":\"a\",\"param2\":\"b\"})",
                                            "SetError(401,{\"param1\":\"\",\"param2\":\"\"})"));
}

TEST(Handler, OnlyAForeignCameraIsUnavailable) {
    struct Row {
        bool is_cms_host;
        int owner_host;
        bool available;
    };
    for (const Row& row : {Row{true, 3, true}, Row{false, 0, true}, Row{false, 3, false}}) {
        ScriptedPlatform platform;
        platform.is_cms_host = row.is_cms_host;
        platform.owner_host = row.owner_host;
        EXPECT_EQ(ProbeHandler(platform).IsCamAvailiable(9), row.available);
        ASSERT_EQ(platform.logs.size(), row.available ? 0U : 1U);
        if (!row.available) {
            const auto& log = platform.logs[0];
            EXPECT_EQ(log.text, "Camera[9]: Modify detection param while CMS closed.\n");
            EXPECT_EQ(log.file + "/" + log.func, "webapi/include/lhwebapihandler/IsCamAvailiable");
            EXPECT_EQ(log.line, 584);
        }
    }
}

TEST(Handler, OnlyAManagingHostBelievesRelayedCmd) {
    for (const bool is_cms_host : {false, true}) {
        for (const bool sent : {false, true}) {
            ScriptedPlatform platform;
            platform.is_cms_host = is_cms_host;
            platform.params["relayedCmd"] = sent;
            ProbeHandler handler(platform);
            handler.TakeRelayedCmd();
            EXPECT_EQ(handler.m_bRelayed, is_cms_host && sent);
        }
    }
}

TEST(Table, RowsReachTheirMethodsAndEndInZeros) {
    const std::string player = "VEXO.Lookhaven.Player";
    struct Row {
        std::string api, method;
        APIProcess process;
        Calls calls;  // of the handler, for a caller without rights
    };
    lookhaven::test::StdoutCapture redirects;
    const Calls search = {"GetAPIMethod()", "GetParam(mount_id,0)"};
    const Calls play = {"GetSessionID()", "GetAPIMethod()"};
    const Row rows[] = {
        {player, "EnumEvent", Process, search},
        {player, "SearchAvaiDate", Process, search},
        {player, "PlayMjpegEvent", ProcessPlayEvent, play + Calls{"GetParam(mountid,\"0\")"}},
        {player, "PlayMjpegEventNoFrameId", ProcessPlayEvent, play + Calls{"GetParam(mountid,0)"}},
        {player, "LoadCamera", ProcessLoadCamera, {"GetAPIMethod()", "GetParam(camera,0)"}},
        {player + ".LiveviewSrc", "Play", ProcessLiveviewSrc, kNoSession + kPairedHost},
    };
    const APIRow* found = GetAPITable();
    EXPECT_EQ(found, gTable);
    for (const Row& row : rows) {
        SCOPED_TRACE(row.method);
        ASSERT_NE(found->m_szApi, nullptr);
        EXPECT_EQ(found->m_szApi, row.api);
        EXPECT_EQ(found->m_Version, 1);
        EXPECT_EQ(found->m_szMethod, row.method);
        EXPECT_EQ(found->m_Process, row.process);
        for (const bool known : {true, false}) {
            ScriptedPlatform platform;
            platform.method = known ? row.method : "Other";
            found->m_Process(platform.Request(), platform.Response());
            Calls calls = Calls{"GetParam(relayedCmd,false)", "IsCmsHost()", "SetAffinity()"} + row.calls;
            if (known) {
                platform.calls.resize(std::min(platform.calls.size(), calls.size()));
            } else if (const auto method = std::find(calls.begin(), calls.end(), "GetAPIMethod()");
                       method != calls.end()) {
                calls.erase(method + 1, calls.end());
            }
            EXPECT_EQ(platform.calls, calls);
        }
        ++found;
    }
    const APIRow end = {};
    EXPECT_EQ(std::memcmp(found, &end, sizeof end), 0);
}

TEST(Entry, ExceptionsPassThrough) {
    ScriptedPlatform platform;
    platform.params["relayedCmd"] = "text";
    EXPECT_THROW(Process(platform.Request(), platform.Response()), Json::Exception);
}

struct FilterRow {
    const char* name;
    int category_level;
    int pid_count;
    std::vector<DbgLogPidLevel> pids;
    LOG_LEVEL level;
    bool written;
};

TEST(LogFilter, AdmitsByCategoryOrOwnProcess) {
    const int self = getpid();
    const FilterRow rows[] = {
        {"category at the level", 6, 0, {}, LOG_LEVEL_DEBUG, true},
        {"category below the level", 5, 0, {}, LOG_LEVEL_DEBUG, false},
        {"own entry at the level", 0, 1, {{self, 4}}, LOG_LEVEL_NOTICE, true},
        {"own entry below the level", 0, 1, {{self, 4}}, LOG_LEVEL_INFO, false},
        {"another's entry", 0, 1, {{self + 1, 6}}, LOG_LEVEL_ERR, false},
        {"the first own entry counts", 0, 3, {{self + 1, 6}, {self, 3}, {self, 6}}, LOG_LEVEL_NOTICE, false},
        {"entry beyond the count", 0, 1, {{self + 1, 6}, {self, 6}}, LOG_LEVEL_ERR, false},
        {"count 0", 0, 0, {{self, 6}}, LOG_LEVEL_ERR, false},
        {"negative count", 0, -1, {{self, 6}}, LOG_LEVEL_ERR, false},
        {"count beyond the table", 0, 1 << 30, {}, LOG_LEVEL_ERR, false},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        ScriptedPlatform platform;
        platform.log_cfg.m_CategLevel[32] = row.category_level;
        platform.log_cfg.m_CategLevel[68] = 1000;
        platform.log_cfg.m_PidCount = row.pid_count;
        std::copy(row.pids.begin(), row.pids.end(), platform.log_cfg.m_PidLevel);
        int evaluated = 0;
        LH_TRACE(LOG_CATEG_LIVEVIEW, row.level, "source", "%d\n", ++evaluated);
        EXPECT_EQ(evaluated, row.written);
        EXPECT_EQ(platform.logs.size(), row.written ? 1U : 0U);
    }
}

TEST(LogFilter, WithoutConfigurationOnlyUnconditionalLines) {
    ScriptedPlatform platform;
    g_pDbgLogCfg = nullptr;
    LH_TRACE(LOG_CATEG_LIVEVIEW, LOG_LEVEL_ERR, "source", "gated\n");
    EXPECT_EQ(g_DbgLogPid, 0);
    LH_LOG("source", "always\n");
    ASSERT_THAT(platform.calls, ElementsAre("log always\n"));
    EXPECT_EQ(platform.logs[0].categ + platform.logs[0].level, "nullnull");
}

TEST(LogFilter, NamesCategoryAndLevel) {
    ScriptedPlatform platform;
    platform.log_cfg.m_CategLevel[32] = 6;
    LH_TRACE(LOG_CATEG_LIVEVIEW, LOG_LEVEL_INFO, "source", "named\n");
    LH_TRACE(LOG_CATEG_LIVEVIEW, LOG_LEVEL(3), "source", "not named\n");
    EXPECT_THAT(platform.calls, ElementsAre("log live/5 named\n", "log live/unknown not named\n"));
}

}  // namespace
