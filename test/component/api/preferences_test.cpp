// SPDX-License-Identifier: Apache-2.0
//
// Preferences and sessions of the caller's own account: every account has them, and nobody another's.
#include <algorithm>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/json_text.h"
#include "standalone/store/audit_log.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;

namespace {

class OwnAccountApi : public testing::Test {
  protected:
    Answer Ask(const std::string& method, const std::string& body, const std::string& cookie) const {
        return host_.Ask("api=VEXO.User&version=1&method=" + method, cookie, {{"CONTENT_TYPE", "application/json"}},
                         body);
    }

    HostUnderTest host_;
    std::string admin_ = host_.LogIn().secret;
    std::string guest_ = host_.LogIn("guest").secret;
};

TEST_F(OwnAccountApi, PreferencesAreTheCallersOwn) {
    const std::string large = R"({"preferences": {"a": ")" + std::string(20'000, 'a') + "\"}}";
    const struct {
        const char* method;
        std::string body;
        std::string cookie;
        int status;
        const char* preferences;  // in the answer
    } rows[] = {
        {"Preferences", "{}", guest_, 200, "{}"},
        {"SetPreferences", R"({"preferences": {"layout": "2", "order": [2, 1]}})", guest_, 200,
         R"({"layout":"2","order":[2,1]})"},
        {"SetPreferences", R"({"id": 2, "preferences": {"layout": null}})", guest_, 200, R"({"order":[2,1]})"},
        {"SetPreferences", R"({"id": 1, "preferences": {"layout": "3"}})", guest_, 403, nullptr},
        {"SetPreferences", R"({"id": 2, "preferences": {"layout": "3"}})", admin_, 403, nullptr},
        {"SetPreferences", R"({"preferences": ["layout"]})", guest_, 400, nullptr},
        {"SetPreferences", R"({"preferences": {"a": "\u0000"}})", guest_, 400, nullptr},
        {"SetPreferences", "{}", guest_, 400, nullptr},
        {"SetPreferences", large, guest_, 400, nullptr},
        {"SetPreferences", R"({"preferences": {"layout": "3"}})", "", 401, nullptr},
        {"Preferences", "{}", "", 401, nullptr},
        {"Preferences", "{}", admin_, 200, "{}"},
        {"Preferences", "{}", guest_, 200, R"({"order":[2,1]})"},
    };
    for (const auto& row : rows) {
        const Answer answer = Ask(row.method, row.body, row.cookie);
        EXPECT_EQ(answer.status, row.status) << row.method << row.body.substr(0, 99);
        if (row.preferences != nullptr) {
            EXPECT_EQ(base::OneLineJson(answer.Json()["data"]["preferences"]), row.preferences)
                << row.method << row.body;
        }
    }
    EXPECT_EQ(host_.Ask("api=VEXO.User&version=1&method=Preferences", guest_).status, 405);
    EXPECT_EQ(host_
                  .Ask("api=VEXO.User&version=1&method=SetPreferences", guest_,
                       {{"CONTENT_TYPE", "application/json"}, {"HTTP_SEC_FETCH_SITE", "cross-site"}},
                       R"({"preferences": {"layout": "3"}})")
                  .status,
              403);
}

TEST_F(OwnAccountApi, EverybodySeesAndEndsTheOwnSessionsAndNoOthers) {
    const std::string phone = host_.LogIn("guest").secret;
    const std::string tablet = host_.LogIn("guest").secret;
    const Json::Value own = Ask("Sessions", "{}", guest_).Json()["data"]["session"];
    ASSERT_EQ(own.size(), 3U);
    int current = 0;
    for (const Json::Value& session : own) {
        current += session["current"].asBool() ? 1 : 0;
    }
    EXPECT_EQ(current, 1);
    const Json::Value on_phone = Ask("Sessions", R"({"id": 2})", phone).Json()["data"]["session"];
    const auto key_of_current = [](const Json::Value& sessions) {
        return std::find_if(sessions.begin(), sessions.end(),
                            [](const Json::Value& one) { return one["current"].asBool(); })
            ->get("key", "")
            .asString();
    };
    const std::string of_admin = key_of_current(Ask("Sessions", "{}", admin_).Json()["data"]["session"]);
    for (const char* method : {"Sessions", "EndSessions"}) {
        const std::string refused = Ask(method, R"({"id": 1})", guest_).body;
        EXPECT_EQ(refused, Ask(method, R"({"id": 99})", guest_).body) << "which accounts there are";
        EXPECT_THAT(refused, testing::HasSubstr("403"));
        EXPECT_EQ(Ask(method, R"({"id": 4294967298})", guest_).status, 400);
        EXPECT_EQ(Ask(method, "{}", "").status, 401);
    }
    const auto end = [this](const std::string& key) {
        return Ask("EndSessions", R"({"key": ")" + key + "\"}", guest_).Json()["data"]["ended"].asInt();
    };
    EXPECT_EQ(end(of_admin), 0);
    EXPECT_EQ(end(key_of_current(on_phone)), 1);
    EXPECT_EQ(end(key_of_current(on_phone)), 0);
    EXPECT_EQ(Ask("Sessions", "{}", phone).status, 401);
    EXPECT_EQ(Ask("EndSessions", "{}", guest_).Json()["data"]["ended"], 1) << "the tablet's";
    EXPECT_EQ(Ask("Sessions", "{}", tablet).status, 401);
    EXPECT_EQ(Ask("Sessions", "{}", guest_).Json()["data"]["session"].size(), 1U);
    EXPECT_EQ(Ask("Sessions", "{}", admin_).status, 200);
    std::string told;
    store::Store records = store::Store::Open(host_.Home().StoreUrl());
    for (const store::AuditEntry& entry : store::AuditLog(records).List(0, 9)) {
        told += entry.who + " " + entry.action + " " + entry.object + " " + entry.after + ";";
    }
    EXPECT_EQ(told, R"(guest user.endSessions guest (2) {"ended":1};guest user.endSessions guest (2) {"ended":1};)");
}

}  // namespace
}  // namespace lookhaven::api
