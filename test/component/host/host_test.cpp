// SPDX-License-Identifier: Apache-2.0
//
// The web API host as a running program: what it answers, and what it limits.
#include <array>
#include <chrono>

#include <sys/socket.h>

#include "test/component/host/running_host.h"
#include "test/support/host/scgi_bytes.h"

namespace lookhaven::host {
namespace {

using namespace std::chrono_literals;

TEST_F(RunningHost, GivesTheAnswerThatFits) {
    const std::string test = "api=Test&version=1&method=";
    const std::string live = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=";
    const struct {
        std::string query;
        std::string cookie;
        int status;
        HostUnderTest::Headers headers = {};
        std::string body = "";
    } cases[] = {
        {test + "Success", admin_, 200},
        {test + "Error", admin_, 200},
        {test + "Nothing", admin_, 502},
        {test + "Silenced", admin_, 502},
        {test + "EmptyStream", admin_, 504},
        {test + "Throw", admin_, 500},
        {test + "ThrowNumber", admin_, 500},
        {test + "WrongType&text=abc", admin_, 400},
        {test + "Success", "", 401},
        {test + "Success", "0123", 401},
        {test + "Success", std::string(5000, 'x'), 401},
        {live + "Success", "", 200},
        {live + "Nothing", "", 401},
        {live + "EmptyStream", "", 504},
        {live + "EmptyStream", admin_, 504},
        {live + "Nothing", admin_, 502},
        {test + "Missing", admin_, 404},
        {"api=Test&version=2&method=Success", admin_, 404},
        {"api=Other&version=1&method=Success", admin_, 404},
        {"api=VEXO.Auth&version=1&method=Missing", admin_, 404},
        {"", admin_, 404},
        {"api=Test&version=abc&method=Success", admin_, 400},
        {"api=[1]&version=1&method=Success", admin_, 400},
        {test + "Success&p=%zz", admin_, 400},
        {test + "Success", admin_, 400, {{"CONTENT_TYPE", "application/json"}}, "[]"},
        {test + "Success", admin_, 200, {{"CONTENT_TYPE", "application/json"}}, "{}"},
        {test + "Success", admin_, 405, {{"REQUEST_METHOD", "PUT"}}},
        {test + "Success", admin_, 403, {{"HTTP_SEC_FETCH_SITE", "cross-site"}}, "a=1"},
        {test + "Success", admin_, 403, {{"HTTP_SEC_FETCH_SITE", "cross-site"}}},
        {test + "Success", admin_, 403, {{"HTTP_SEC_FETCH_SITE", "same-site"}}, "a=1"},
        {test + "Success", admin_, 403, {{"HTTP_SEC_FETCH_SITE", "same-site"}}},
        {test + "Success", admin_, 200, {{"HTTP_SEC_FETCH_SITE", "none"}}, "a=1"},
        {test + "Success", admin_, 200, {{"HTTP_SEC_FETCH_SITE", "none"}}},
        {test + "Success", admin_, 200, {{"HTTP_SEC_FETCH_SITE", "same-origin"}}, "a=1"},
        {test + "Success", admin_, 403, {{"HTTP_ORIGIN", "https://evil.example"}, {"HTTP_HOST", "nvr:8443"}}, "a=1"},
        {test + "Success", admin_, 200, {{"HTTP_ORIGIN", "https://nvr:8443"}, {"HTTP_HOST", "nvr:8443"}}, "a=1"},
    };
    for (const auto& each : cases) {
        const Answer answer = host_.Ask(each.query, each.cookie, each.headers, each.body);
        const Json::Value json = answer.Json();
        EXPECT_EQ(answer.status, each.status) << each.query << each.body << answer.body;
        EXPECT_EQ(answer.headers.at("Content-Type"), "application/json");
        EXPECT_EQ(answer.headers.at("Cache-Control"), "no-store");
        EXPECT_EQ(answer.headers.at("Content-Length"), std::to_string(answer.body.size()));
        EXPECT_EQ(json["error"].isMember("message"), each.status != 200) << each.query;
        if (each.status != 200) {
            EXPECT_EQ(json["error"]["code"], each.status);
            EXPECT_EQ(json["success"], false);
        }
    }
    EXPECT_EQ(host_.Ask(test + "Error", admin_).Json()["error"]["code"], 401) << "the last of success and error counts";
    EXPECT_EQ(host_.Ask(test + "Raw", admin_).body, "raw") << "nothing follows raw bytes";
    EXPECT_EQ(host_.Ask(test + "RawThenThrow", admin_).body, "half");
    EXPECT_EQ(host_.Ask(test + "Crash", admin_).status, 0);
}

TEST(Host, SurvivesMalformedRequests) {
    const HostUnderTest host({"--read-seconds", "0.5"});
    const std::string long_head = ScgiBytes({{"LONG", std::string(9000, 'x')}});
    for (const std::string& bytes : {std::string("-5:"), std::string("GET / HTTP/1.1\r\n\r\n"), long_head,
                                     ScgiBytes({}, std::string(21 << 20, 'x')), ScgiBytes({}) + "more"}) {
        const Answer answer = host.Exchange(bytes);
        EXPECT_EQ(answer.status, 400) << bytes.substr(0, 20);
        EXPECT_EQ(answer.Json()["error"]["code"], 400);
    }
    EXPECT_EQ(host.Exchange("40:CONTENT_").status, 408) << "a request that never ends";
    EXPECT_EQ(host.Ask("api=VEXO.Auth&version=1&method=Status", "").status, 401);
}

TEST_F(RunningHost, TellsTheHandlerWhoCalls) {
    const store::NewSession session = host_.LogIn("guest");
    const Json::Value caller = host_.Ask("api=Test&version=1&method=Caller", session.secret).Json()["data"];
    EXPECT_EQ(caller["uid"], 2);
    EXPECT_EQ(caller["name"], "guest");
    EXPECT_EQ(caller["session"], session.handle) << "never the cookie";
    EXPECT_EQ(caller["ip"], "192.0.2.7");
    EXPECT_EQ(caller["admin"], false);
    EXPECT_EQ(caller["authorized"], true);
}

TEST_F(RunningHost, GivesTheHandlerAFreshProcess) {
    const base::FileDescriptor other = OpenStream(host_, admin_);
    const Json::Value found = host_.Ask("api=Test&version=1&method=Environment", admin_).Json()["data"];
    EXPECT_EQ(found["masked"].size(), 0U);
    Json::Value ignored;
    for (const int number : {SIGHUP, SIGINT, SIGQUIT, SIGUSR1, SIGUSR2, SIGPIPE}) {
        ignored.append(number);
    }
    EXPECT_EQ(found["ignored"], ignored);
    EXPECT_EQ(found["nonblocking"], false);
    EXPECT_EQ(found["log_pid"], 0);
    EXPECT_LE(found["highest_descriptor"].asInt(), 8) << "the host's other connections are closed";
}

TEST(Host, LimitsRequestsInAllAndPerUser) {
    const HostUnderTest host({"--max-requests", "5", "--max-requests-per-user", "3"});
    const std::string admin = host.LogIn().secret;
    const std::string guest = host.LogIn("guest").secret;
    std::vector<base::FileDescriptor> running;
    for (int i = 0; i < 3; ++i) {
        running.push_back(OpenStream(host, host.LogIn().secret));
    }
    const Answer refused = host.Ask("api=Test&version=1&method=Success", admin);
    EXPECT_EQ(refused.status, 503) << "however many sessions";
    EXPECT_EQ(refused.headers.count("Retry-After"), 1U);
    // An answered request counts until its process is gone.
    ASSERT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 3; }));
    running.push_back(OpenStream(host, guest));
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", guest).status, 200);
    ASSERT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 4; }));
    running.push_back(OpenStream(host, guest));
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", guest).status, 503);
    running.clear();
    EXPECT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 0; }));
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", admin).status, 200);
}

TEST(Host, KeepsRoomForOwnerAndLogInWhateverAViewerOpens) {
    const HostUnderTest host({"--max-requests", "32", "--max-requests-per-user", "64"});
    const std::string guest = host.LogIn("guest").secret;
    const std::string admin = host.LogIn().secret;
    const std::string success = "api=Test&version=1&method=Success";
    std::vector<base::FileDescriptor> running;
    for (int i = 0; i < 29; ++i) {
        running.push_back(OpenStream(host, guest));
    }
    EXPECT_EQ(host.Ask(success, guest).status, 503);
    ASSERT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 29; }));
    running.push_back(OpenStream(host, admin));
    running.push_back(OpenStream(host, admin));
    EXPECT_EQ(host.Ask(success, admin).status, 503);
    EXPECT_EQ(host.Ask("api=VEXO.Auth&version=1&method=Login", "", {}, "account=admin&password=right+password").status,
              200);
}

TEST(Host, RunsFewSearchesOfAUserAtOnce) {
    const HostUnderTest host({"--max-searches-per-user", "2"});
    const std::string guest = host.LogIn("guest").secret;
    base::FileDescriptor first = host.Open("Hang", guest);
    const base::FileDescriptor second = host.Open("Hang", host.LogIn("guest").secret);
    ASSERT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 2; }));
    const base::FileDescriptor stream = OpenStream(host, host.LogIn().secret);
    // Processes are there before their searches are: a third one may still come before the second.
    base::FileDescriptor waiting;
    std::array<char, 1> byte{};
    ASSERT_TRUE(Eventually(5s, [&] {
        waiting = host.Open("Success", guest);
        const bool is_answered =
            Eventually(300ms, [&] { return recv(waiting.Get(), byte.data(), byte.size(), MSG_DONTWAIT) >= 0; });
        return !is_answered;
    })) << "a third search of the user is answered beside two";
    EXPECT_EQ(host.RequestProcesses(), 4U);
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", host.LogIn().secret).status, 200) << "another's search";
    EXPECT_EQ(recv(waiting.Get(), byte.data(), byte.size(), MSG_DONTWAIT), -1);
    first.Reset();
    EXPECT_EQ(HostUnderTest::ReadAnswer(waiting).status, 200);
}

TEST(Host, LimitsTimeAndMemoryOfWhatDoesNotStream) {
    const HostUnderTest host({"--answer-seconds", "0.5"});
    const std::string admin = host.LogIn().secret;
    const base::FileDescriptor stream = OpenStream(host, admin);
    const base::FileDescriptor hanging = host.Open("Hang", admin);
    EXPECT_TRUE(Eventually(3s, [&] { return IsOver(hanging); }));
    EXPECT_TRUE(HasPicture(stream)) << "a stream may go on for ever";
#ifndef __SANITIZE_ADDRESS__
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Devour", admin).status, 500);
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Devour&stream=true", admin).status, 200) << "a stream needs its ring";
#endif
}

TEST_F(RunningHost, LogsInAndOut) {
    const std::string query = "api=VEXO.Auth&version=1&method=";
    const std::string right = "account=admin&password=right+password";
    EXPECT_EQ(host_.Ask(query + "Login&" + right, "").status, 405) << "a password belongs in a body";
    const Answer wrong = host_.Ask(query + "Login", "", {}, "account=admin&password=wrong");
    EXPECT_EQ(wrong.status, 401);
    EXPECT_EQ(host_.Ask(query + "Login", "", {}, "account=nobody&password=wrong").body, wrong.body);
    EXPECT_EQ(host_.Ask(query + "Login", "", {}, "").status, 405);
    const Answer plain = host_.Ask(query + "Login", "", {}, right);
    EXPECT_EQ(plain.status, 200);
    const std::string plain_line = plain.headers.at("Set-Cookie");
    EXPECT_TRUE(plain_line.starts_with("id=") && plain_line.find("Secure") == std::string::npos) << plain_line;
    const Answer answer = host_.Ask(query + "Login", "", {{"HTTPS", "on"}, {"CONTENT_TYPE", "application/json"}},
                                    R"({"account":"admin","password":"right password"})");
    EXPECT_EQ(answer.Json()["data"]["account"], "admin");
    EXPECT_EQ(answer.Json()["data"]["is_manager"], true);
    const std::string line = answer.headers.at("Set-Cookie");
    const std::string name = "__Host-id=";
    EXPECT_TRUE(line.starts_with(name) && line.ends_with("; Path=/; HttpOnly; SameSite=Strict; Secure")) << line;
    const std::string cookie = line.substr(name.size(), line.find(';') - name.size());
    EXPECT_EQ(host_.Ask(query + "Status", cookie).Json()["data"], answer.Json()["data"]);
    EXPECT_EQ(host_.Ask(query + "Status", cookie, {{"HTTPS", "on"}}).status, 401) << "its name over plain HTTP";
    EXPECT_EQ(host_.Ask(query + "Logout", cookie).status, 405);
    EXPECT_EQ(host_.Ask(query + "Logout", cookie, {}, "a=1").status, 200);
    EXPECT_EQ(host_.Ask(query + "Status", cookie).status, 401);
}

}  // namespace
}  // namespace lookhaven::host
