// SPDX-License-Identifier: Apache-2.0
//
// Who may call, and what a caller without a session or with narrowed rights is refused: each row is an attack.
#include <algorithm>
#include <array>
#include <atomic>
#include <csignal>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <sys/socket.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/remote/pair_token.h"
#include "standalone/store/connection.h"
#include "standalone/store/servers.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"
#include "test/support/host/host_under_test.h"
#include "test/support/host/scgi_bytes.h"
#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::api {

using host::HostUnderTest;

namespace {

class Admission : public testing::Test {
  protected:
    int Status(const std::string& query, bool has_session, const std::string& body = "",
               HostUnderTest::Headers headers = {}) const {
        const host::Answer answer = host_.Ask(query, has_session ? admin_ : "", std::move(headers), body);
        EXPECT_EQ(answer.status == 200 ? 200 : answer.Json()["error"]["code"].asInt(), answer.status);
        return answer.status;
    }

    HostUnderTest host_;
    std::string admin_ = host_.LogIn().secret;
};

TEST_F(Admission, ALogInIsWhatTheWebServerTookForOne) {
    const std::string right = "account=admin&password=right+password";
    const std::string login = "api=VEXO.Auth&version=1&method=Login";
    EXPECT_EQ(Status(login, false, right), 200);
    EXPECT_EQ(Status("", false, login + "&" + right), 200) << "the web server counts a POST that names no api as one";
    EXPECT_EQ(Status("api=VEXO.Event&%61pi=VEXO.Auth&version=1&method=Login", false, right), 400);
    EXPECT_EQ(Status("api=VEXO.Event&version=1&method=Mark", false, login + "&" + right), 400);
    EXPECT_EQ(
        Status("api=VEXO.Event", false,
               R"({"api":"VEXO.Auth","version":1,"method":"Login","account":"admin","password":"right password"})",
               {{"CONTENT_TYPE", "application/json"}}),
        400);
    EXPECT_EQ(Status(login + "&password=right+password", false, "account=admin"), 400) << "no password in an address";
}

TEST_F(Admission, OnlyASessionMayCostMuch) {
    const std::string large(1 << 20, 'x');
    const std::string success = "api=Test&version=1&method=Success";
    EXPECT_EQ(Status(success, false, "p=" + large.substr(0, 5000)), 401);
    for (const std::string& cookie : {std::string(), std::string("0123"), std::string(64, 'a')}) {
        EXPECT_EQ(host_.Ask(success, cookie, {}, large).status, 401) << cookie;
    }
    EXPECT_EQ(Status("api=VEXO.Auth&version=1&method=Login", false, large), 413);
    EXPECT_EQ(Status(success, true, "p=" + large.substr(2)), 200);
    const std::string promise = ScgiBytes({{"REQUEST_METHOD", "POST"}, {"QUERY_STRING", success}}, large);
    EXPECT_EQ(host_.Exchange(promise.substr(0, promise.size() - large.size())).status, 401) << "a body is not awaited";
}

TEST(FalseSession, CostsNoProcess) {
    const HostUnderTest host({"--max-requests", "1"});
    const std::string body(1 << 20, 'x');
    const std::string real = host.LogIn().secret;
    std::string forged = real;
    forged.front() = real.front() == '0' ? '1' : '0';
    const auto status = [&](const std::string& cookie) {
        return host.Ask("api=Test&version=1&method=Success", cookie, {}, body).status;
    };
    // The process that answered the log-in may still be there.
    base::FileDescriptor stream;
    ASSERT_TRUE(host::Eventually(std::chrono::seconds(20), [&] {
        stream = host.Open("Stream", real);
        return host::Eventually(std::chrono::seconds(1), [&] { return host.RequestProcesses() == 1; });
    }));
    // Each more than once: the connection before may still be there, and the host waits for one request alone.
    for (const std::string& cookie : {forged, std::string(64, 'a') + "; other=" + forged}) {
        EXPECT_TRUE(host::Eventually(std::chrono::seconds(5), [&] { return status(cookie) == 401; }))
            << "all processes are taken, and it needs none";
    }
    EXPECT_EQ(status(real), 503);
    EXPECT_EQ(status("z; id=" + real), 503) << "any of the cookies may be it";
}

TEST_F(Admission, FewPasswordsAreHashedAtOnce) {
    const std::string login = "api=VEXO.Auth&version=1&method=Login";
    const auto attempt = [&](int number) {
        base::FileDescriptor connection = host_.Connect();
        const std::string bytes = ScgiBytes({{"REQUEST_METHOD", "POST"},
                                             {"QUERY_STRING", login},
                                             {"CONTENT_TYPE", "application/x-www-form-urlencoded"}},
                                            "password=wrong&account=a" + std::to_string(number));
        send(connection.Get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
        return connection;
    };
    std::vector<base::FileDescriptor> attempts(40);
    std::ranges::generate(attempts, [&, n = 0]() mutable { return attempt(++n); });
    int refused = 0;
    for (const base::FileDescriptor& each : attempts) {
        const host::Answer answer = HostUnderTest::ReadAnswer(each);
        EXPECT_TRUE(answer.status == 401 || answer.status == 503) << answer.body;
        EXPECT_EQ(answer.headers.count("Retry-After"), answer.status == 503 ? 1U : 0U);
        refused += answer.status == 503 ? 1 : 0;
    }
    EXPECT_GT(refused, 0);
    std::ranges::generate(attempts, [&, n = 100]() mutable { return attempt(++n); });
    attempts.clear();
    EXPECT_TRUE(host::Eventually(std::chrono::seconds(15), [&] { return host_.RequestProcesses() == 0; }));
    EXPECT_EQ(Status(login, false, "account=admin&password=right+password"), 200) << "clients that left make room";
}

TEST_F(Admission, WhoIsLoggedInKeepsNobodyFromLoggingIn) {
    const std::string guest = host_.LogIn("guest").secret;
    std::atomic<int> refused = 0;
    std::vector<std::jthread> loops;
    for (int i = 0; i < 4; ++i) {
        loops.emplace_back([&](const std::stop_token& end) {
            while (!end.stop_requested()) {
                const int status = host_
                                       .Ask("api=VEXO.User&version=1&method=ChangePassword", guest, {},
                                            "password=other+password&newPassword=other+password")
                                       .status;
                refused += status == 503 ? 1 : 0;
            }
        });
    }
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(Status("api=VEXO.Auth&version=1&method=Login", false, "account=admin&password=right+password"), 200);
    }
    EXPECT_TRUE(host::Eventually(std::chrono::seconds(5), [&] { return refused > 0; })) << "one hash at a time";
}

TEST_F(Admission, LogInsAndRefusalsAreLoggedCleanly) {
    const std::string login = "api=VEXO.Auth&version=1&method=Login";
    const HostUnderTest::Headers from{{"REMOTE_ADDR", "2001:db8::9"}};
    EXPECT_EQ(Status(login, false, "account=ADMIN&password=right+password", from), 200);
    const std::string forged = "x%22+from+%22::1%22%0A%1B%5B2J%C2%9B%7F" + std::string(500, 'y');
    EXPECT_EQ(Status(login, false, "password=wrong&account=" + forged, from), 401);
    const auto line = [this](const char* file) {
        return base::ReadFile(host_.Home().LogFolder() / file).substr(std::string("2026-01-01T00:00:00.000Z ").size());
    };
    EXPECT_EQ(line("log-ins.log"), "\"admin\" from \"2001:db8::9\": logged in\n");
    const std::string refusal = line("refused-log-ins.log");
    EXPECT_TRUE(refusal.starts_with(R"("x\" from \"::1\"\n\u001b[2J\u009b yyy)")) << refusal;
    EXPECT_TRUE(refusal.ends_with("y\" from \"2001:db8::9\": wrong account or password\n")) << refusal;
    EXPECT_LT(refusal.size(), 160U);
}

TEST(PairedHosts, AreOneUserTogether) {
    const HostUnderTest host({"--max-requests-per-user", "2"});
    store::Store records = store::Store::Open(host.Home().StoreUrl());
    const std::string now = std::to_string(base::WallSeconds());
    std::vector<base::FileDescriptor> running;
    const auto open = [&](const std::string& secret) {
        return host.OpenQuery("api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=PairedStream&timestamp=" + now +
                                  "&cookie=" + remote::MakePairToken(secret, now),
                              "");
    };
    store::RecordingServer other;
    for (const std::string& secret : {std::string(64, 'a'), std::string(64, 'b')}) {
        other.name = "Host " + secret.substr(0, 1);
        store::RecordingServers(records).Add(other, secret);
        running.push_back(open(secret));
    }
    ASSERT_TRUE(host::Eventually(std::chrono::seconds(2), [&] { return host.RequestProcesses() == 2; }));
    std::array<char, 8> begun{};
    for (const base::FileDescriptor& each : running) {
        EXPECT_GT(recv(each.Get(), begun.data(), begun.size(), 0), 0);
    }
    EXPECT_EQ(HostUnderTest::ReadAnswer(open(std::string(64, 'b'))).status, 503);
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", host.LogIn().secret).status, 200);
    other = *store::RecordingServers(records).Find(1);
    other.enabled = false;
    store::RecordingServers(records).Update(other);
    EXPECT_TRUE(host::Eventually(std::chrono::seconds(2), [&] { return host.RequestProcesses() == 1; }))
        << "one of two goes on: its pairing does";
}

TEST_F(Admission, AStoreThatCannotBeWrittenStillServesWhoIsLoggedIn) {
    store::Store records = store::Store::Open(host_.Home().StoreUrl());
    const auto user = store::Users(records).CheckPassword("admin", "right password");
    const std::string idle = store::Sessions(records).Create(*user, base::WallSeconds() - 300).secret;
    // Other writers wait for this transaction in vain.
    const int status = records.connection().Write(
        [&](soci::session&) { return host_.Ask("api=Test&version=1&method=Success", idle).status; });
    EXPECT_EQ(status, 200);
}

TEST_F(Admission, AStoreThatFailsIsNeverAnEmptyList) {
    store::Store records = store::Store::Open(host_.Home().StoreUrl());
    const std::string search = "api=Test&version=1&method=Search";
    EXPECT_EQ(Status(search, true), 200);
    for (const char* table : {"events", "sessions"}) {
        records.connection().Write([table](soci::session& sql) { sql << "drop table " << table; });
        const host::Answer answer = host_.Ask(search, admin_);
        EXPECT_EQ(answer.status, 500) << table;
        EXPECT_NE(answer.body.find("the record store cannot be read"), std::string::npos) << answer.body;
    }
    base::WriteFileAtomically(host_.Home().Home() / "store", "postgresql:host=/nonexistent dbname=lookhaven\n");
    const host::Answer answer = host_.Ask(search, admin_);
    EXPECT_EQ(answer.status, 503) << answer.body << "may be tried again: a standby may take over";
}

TEST_F(Admission, AConnectionThatWasOpenedAheadAndIsLostCostsNoRequest) {
    test::TemporaryPostgres server;
    const std::string url = server.NewDatabase();
    store::Store::Migrate(url);
    store::Store records = store::Store::Open(url);
    store::Users(records).Add("admin", "right password", store::Privilege::kOwner);
    base::WriteFileAtomically(host_.Home().Home() / "store", url);
    const std::string session = host_.LogIn().secret;
    ASSERT_TRUE(host::Eventually(std::chrono::seconds(20), [&] { return host_.SpareProcesses().size() == 4; }));
    const auto spares = host_.SpareProcesses();
    std::ranges::for_each(spares, [](pid_t spare) { ::kill(spare, SIGKILL); });  // theirs is the store from before
    const std::string others = " from pg_stat_activity where datname = current_database() and pid <> pg_backend_pid()";
    const auto count = [&] { return records.connection().FetchOne<int>("select count(*)" + others).value(); };
    ASSERT_TRUE(host::Eventually(std::chrono::seconds(20), [&] { return count() == std::ssize(spares); }));
    records.connection().FetchAll<std::string>("select pg_terminate_backend(pid)::text" + others);
    for (std::size_t i = 0; i < spares.size(); ++i) {
        EXPECT_EQ(host_.Ask("api=Test&version=1&method=Search", session).status, 200);
    }
}

TEST_F(Admission, SlowsDownGuessingOfAnAddressOrAnIpv6Network) {
    const auto attempt = [this](const std::string& address, const std::string& password = "wrong") {
        return Status("api=VEXO.Auth&version=1&method=Login", false, "account=admin&password=" + password,
                      {{"REMOTE_ADDR", address}});
    };
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(attempt("2001:db8:0:1:" + std::to_string(i) + "::1"), 401);
    }
    EXPECT_EQ(attempt("2001:db8:0:1:ffff::1", "right+password"), 429);
    EXPECT_EQ(attempt("2001:db8:0:2::1"), 401) << "another network";
    EXPECT_EQ(attempt("::ffff:192.0.2.1"), 401) << "an IPv4 address in IPv6 form";
}

TEST_F(Admission, OtherSitesMayNotAsk) {
    const std::string success = "api=Test&version=1&method=Success";
    for (const std::string& body : {std::string(), std::string("p=1")}) {
        EXPECT_EQ(Status(success, true, body, {{"HTTP_SEC_FETCH_SITE", "cross-site"}}), 403) << body;
        EXPECT_EQ(Status(success, true, body, {{"HTTP_SEC_FETCH_SITE", "same-site"}}), 403) << body;
        EXPECT_EQ(Status(success, true, body, {{"HTTP_SEC_FETCH_SITE", "none"}}), 200) << body;
    }
    // The page of a paired host may, with its token; the caller's session does not count then.
    const std::string live = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Nothing";
    EXPECT_EQ(Status(live, true), 502) << "a session";
    EXPECT_EQ(Status(live, true, "", {{"HTTP_SEC_FETCH_SITE", "cross-site"}}), 401) << "no session";
    EXPECT_EQ(Status(live, true, "p=1", {{"HTTP_SEC_FETCH_SITE", "cross-site"}}), 403);
}

TEST_F(Admission, RestrictionsThatAreNotUnderstoodAreRefused) {
    const std::string success = "api=Test&version=1&method=Success&privData=";
    for (const char* good : {"{}", R"({"deniedCameras":[1,2],"deniedAudio":[]})", R"({"privilege":2})"}) {
        EXPECT_EQ(Status(success + good, true), 200) << good;
    }
    for (const char* bad : {"1", "text", "[1]", "", R"({"deniedCameras":5})", R"({"deniedCameras":["1x"]})",
                            R"({"deniedCameras":[null]})", R"({"deniedCameras":[true]})", R"({"deniedAudio":[1.5]})",
                            R"({"deniedAudio":{"1":2}})", R"({"deniedDoors":[1]})", R"({"privilege":"2"})"}) {
        EXPECT_EQ(Status(success + bad, true), 400) << bad;
    }
}

}  // namespace
}  // namespace lookhaven::api
