// SPDX-License-Identifier: Apache-2.0
//
// VEXO.User: what needs the caller's password again, what a stale page is told, and that no secret comes back.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/store/users.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;

namespace {

class UserApi : public testing::Test {
  protected:
    Answer Ask(const std::string& method, const std::string& body, const std::string& cookie) const {
        return host_.Ask("api=VEXO.User&version=1&method=" + method, cookie, {{"CONTENT_TYPE", "application/json"}},
                         body);
    }
    Answer Ask(const std::string& method, const std::string& body = "{}") const { return Ask(method, body, admin_); }
    Json::Value Guest() const { return Ask("List").Json()["data"]["user"][1]; }
    // A change of the guest that the caller has seen.
    std::string Change(const std::string& members) const {
        return R"({"id": 2, "revision": )" + std::to_string(Guest()["revision"].asInt64()) + members + "}";
    }

    HostUnderTest host_;
    std::string admin_ = host_.LogIn().secret;
};

TEST_F(UserApi, AsksForThePasswordAgainWhereAnAccountCouldBeTakenOver) {
    const std::string right = R"(, "reauth": "right password")";
    const struct {
        const char* method;
        std::string members;
        int status;
    } rows[] = {
        {"Set", R"(, "mayMark": true, "deny": {"live": [], "door": [3]})", 200},
        {"Set", R"(, "privilege": "manager")", 403},
        {"Set", R"(, "password": "a new password")", 403},
        {"Set", R"(, "password": "a new password", "reauth": "other password")", 403},
        {"Remove", "", 403},
        {"Add", R"(, "name": "eve", "password": "a new password")", 403},
        {"Set", R"(, "privilege": "king")" + right, 400},
        {"Set", R"(, "deny": {"live": "all"})" + right, 400},
        {"Set", R"(, "password": "short")", 400},
        {"Add", R"(, "name": "eve", "password": "short")", 400},
        {"Add", R"(, "name": "guest", "password": "a new password")" + right, 400},
        {"Set", R"(, "privilege": "manager", "password": "a new password")" + right, 200},
        {"Add", R"(, "name": "eve", "password": "a new password", "deny": {"emap": [1]})" + right, 200},
        {"Remove", right, 200},
        {"Remove", right, 404},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Ask(row.method, Change(row.members)).status, row.status) << row.method << row.members;
    }
    EXPECT_EQ(host_.Ask("api=VEXO.User&version=1&method=Remove&reauth=right+password", admin_, {}, "id=2").status, 400)
        << "a password in an address";
    int refused = 0;
    for (int attempt = 0; attempt < 6; ++attempt) {
        refused = Ask("Add", R"({"name": "a", "password": "a new password", "reauth": "guessed"})").status;
    }
    EXPECT_EQ(refused, 429) << "as log-ins are";
    EXPECT_EQ(host_.Ask("api=VEXO.Auth&version=1&method=Login", "", {}, "account=admin&password=right+password").status,
              429);
}

TEST_F(UserApi, TellsAStalePageTheRecordAsItIs) {
    const std::string seen = Change(R"(, "deny": {"door": [1]})");
    EXPECT_EQ(Ask("Set", seen).status, 200);
    const Answer stale = Ask("Set", seen);
    EXPECT_EQ(stale.status, 409);
    EXPECT_EQ(stale.Json()["error"]["data"], Guest());
    EXPECT_EQ(Ask("Set", R"({"id": 2})").status, 400) << "a page that saw nothing";
    const Answer last = Ask("Remove", R"({"id": 1, "reauth": "right password", "revision": )" +
                                          Ask("List").Json()["data"]["user"][0]["revision"].asString() + "}");
    EXPECT_EQ(last.status, 409);
    EXPECT_TRUE(last.Json()["error"]["data"].isNull()) << last.body;
}

TEST_F(UserApi, SessionsAreNamedByWhatOpensNothing) {
    const std::string guest = host_.LogIn("guest").secret;
    const Answer login = host_.Ask("api=VEXO.Auth&version=1&method=Login", "", {{"REMOTE_ADDR", "192.0.2.7"}},
                                   "account=guest&password=other+password");
    const Answer list = Ask("Sessions", R"({"id": 2})");
    const Json::Value sessions = list.Json()["data"]["session"];
    ASSERT_EQ(sessions.size(), 2U);
    EXPECT_EQ(sessions[0]["address"].asString() + sessions[1]["address"].asString(), "192.0.2.7");
    EXPECT_THAT(list.body, testing::Not(testing::HasSubstr(guest)));
    for (const Json::Value& session : sessions) {
        EXPECT_EQ(Ask("ChangePassword", "{}", session["key"].asString()).status, 401);
        EXPECT_FALSE(session["current"].asBool());
    }
    EXPECT_EQ(Ask("EndSessions", R"({"id": 1, "key": ")" + sessions[0]["key"].asString() + "\"}").body,
              Ask("EndSessions", R"({"id": 1, "key": ""})").body)
        << "somebody else's";
    EXPECT_EQ(Ask("EndSessions", R"({"id": 2})").Json()["data"]["ended"], 2);
    EXPECT_EQ(Ask("Preview", "{}", guest).status, 401);
    host_.LogIn();
    EXPECT_EQ(Ask("EndSessions", R"({"id": 1})").Json()["data"]["ended"], 1);
    EXPECT_EQ(Ask("List").status, 200) << "the caller's own goes on";
}

TEST_F(UserApi, EverybodyChangesTheOwnPasswordWithTheOldOne) {
    const std::string guest = host_.LogIn("guest").secret;
    const std::string elsewhere = host_.LogIn("guest").secret;
    const auto change = [&](const char* old_one, const char* new_one) {
        return Ask("ChangePassword",
                   std::string(R"({"password": ")") + old_one + R"(", "newPassword": ")" + new_one + "\"}", guest)
            .status;
    };
    EXPECT_EQ(change("wrong", "a new password"), 403);
    EXPECT_EQ(change("guessed", "short"), 400) << "before anything is hashed";
    EXPECT_EQ(change("other password", "a new password"), 200);
    EXPECT_EQ(change("other password", "a newer password"), 403);
    EXPECT_EQ(Ask("List", "{}", guest).status, 403) << "still logged in, and no manager";
    EXPECT_EQ(Ask("List", "{}", elsewhere).status, 401);
}

}  // namespace
}  // namespace lookhaven::api
