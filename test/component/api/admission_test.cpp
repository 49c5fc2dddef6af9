// SPDX-License-Identifier: Apache-2.0
//
// Who may call, and what a caller without a session or with narrowed rights is refused: each row is an attack.
#include <string>

#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/store/connection.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"
#include "test/support/host/host_under_test.h"

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
    EXPECT_EQ(Status(success, false, large), 401);
    EXPECT_EQ(Status("api=VEXO.Auth&version=1&method=Login", false, large), 413);
    EXPECT_EQ(Status(success, true, "p=" + large.substr(2)), 200);
}

TEST_F(Admission, AStoreThatCannotBeWrittenStillServesWhoIsLoggedIn) {
    store::Store records = store::Store::Open(host_.Home().StoreUrl());
    const auto user = store::Users(records).CheckPassword("admin", "right password");
    const std::string idle = store::Sessions(records).Create(*user, base::WallMillis() / 1000 - 300).secret;
    // Other writers wait for this transaction in vain.
    const int status = records.connection().Write(
        [&](soci::session&) { return host_.Ask("api=Test&version=1&method=Success", idle).status; });
    EXPECT_EQ(status, 200);
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
                            R"({"deniedAudio":{"1":2}})", R"({"deniedDoors":[1]})", R"({"privilege":"2"})"}) {
        EXPECT_EQ(Status(success + bad, true), 400) << bad;
    }
}

}  // namespace
}  // namespace lookhaven::api
