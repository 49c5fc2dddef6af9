// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Auth MakeFirstAccount: who is told what before there is an account; guesses are limited and hash nothing.
#include <future>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/admin/first_account.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/store/users.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;
using testing::HasSubstr;
using testing::Not;

namespace {

class FirstAccountApi : public testing::Test {
  protected:
    FirstAccountApi() {
        for (const store::User& user : users_.List()) {
            users_.Remove(user.id);
        }
    }

    Answer Make(const std::string& body, HostUnderTest::Headers headers = {}, const std::string& query = "") const {
        return host_.Ask("api=VEXO.Auth&version=1&method=MakeFirstAccount" + query, "", std::move(headers), body);
    }
    Answer Status() const { return host_.Ask("api=VEXO.Auth&version=1&method=Status", ""); }
    std::string NewToken() { return admin::NewSetupToken(store_, base::TimeSinceBoot()); }
    std::string Log(const char* name) const { return base::ReadFile(host_.Home().LogFolder() / name); }

    HostUnderTest host_;
    store::Store store_ = store::Store::Open(host_.Home().StoreUrl());
    store::Users users_{store_};
};

TEST_F(FirstAccountApi, IsMadeAndLoggedInByTheTokenInTheBodyOfAnOwnPage) {
    EXPECT_EQ(Status().Json()["error"]["data"]["noAccount"], true);
    const std::string token = NewToken();
    base::WriteFileAtomically(admin::SetupAddressFile(host_.Home()), token);
    const std::string right = "account=ada&password=correct+horse&token=" + token;
    const struct {
        const char* attempt;
        std::string body;
        int status;
        HostUnderTest::Headers headers = {};
        std::string query = {};
    } rows[] = {
        {"by GET", "", 405},
        {"the token in the address", "account=ada&password=correct+horse", 400, {}, "&token=" + token},
        {"another site's page", right, 403, {{"HTTP_SEC_FETCH_SITE", "cross-site"}}},
        {"another site's page in an old browser", right, 403, {{"HTTP_ORIGIN", "https://evil.test"}}},
        {"a short password", "account=ada&password=short&token=" + token, 400},
        {"a name that is none", "account=a+b&password=correct+horse&token=" + token, 400},
        {"another token", "account=ada&password=correct+horse&token=" + std::string(48, '0'), 403},
        {"no token", "account=ada&password=correct+horse", 403},
        {"a token of another type",
         R"({"account": "ada", "password": "correct horse", "token": [1]})",
         400,
         {{"CONTENT_TYPE", "application/json"}}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Make(row.body, row.headers, row.query).status, row.status) << row.attempt;
        EXPECT_TRUE(users_.IsEmpty()) << row.attempt;
    }
    const Answer made = Make(right, {{"REMOTE_ADDR", "192.0.2.7"}});
    ASSERT_EQ(made.status, 200) << made.body;
    EXPECT_EQ(made.Json()["data"]["is_manager"], true);
    const std::string line = made.headers.at("Set-Cookie");
    const Answer status = host_.Ask("api=VEXO.Auth&version=1&method=Status", line.substr(3, line.find(';') - 3));
    EXPECT_EQ(status.Json()["data"]["account"], "ada");
    EXPECT_FALSE(std::filesystem::exists(admin::SetupAddressFile(host_.Home())));
    const Answer late = Make(right);
    EXPECT_EQ(late.status, 409) << late.body;
    EXPECT_TRUE(Status().Json()["error"]["data"].isNull()) << "strangers are told nothing else";
    EXPECT_THAT(Log("log-ins.log"), HasSubstr("\"ada\" from \"192.0.2.7\""));
    EXPECT_THAT(Log("refused-log-ins.log"), HasSubstr("wrong or expired setup token"));
    EXPECT_THAT(Log("log-ins.log") + Log("refused-log-ins.log"), Not(HasSubstr(token)));
}

TEST_F(FirstAccountApi, GuessesAreLimitedByNetworkAndHashNothing) {
    const std::string token = NewToken();
    const auto guess = [&](const std::string& guessed, const std::string& address) {
        return Make("account=ada&password=correct+horse&token=" + guessed, {{"REMOTE_ADDR", address}}).status;
    };
    const std::string wrong(48, '0');
    std::vector<std::future<int>> at_once;
    for (int number = 0; number < 16; ++number) {
        const std::string address = "192.0.2." + std::to_string(number);
        at_once.push_back(std::async(std::launch::async, guess, wrong, address));
    }
    for (std::future<int>& status : at_once) {
        EXPECT_EQ(status.get(), 403) << "four passwords are hashed at once, more get 503";
    }
    for (int attempt = 0; attempt < 5; ++attempt) {
        EXPECT_EQ(guess(wrong, "2001:db8::1"), 403);
    }
    EXPECT_EQ(guess(wrong, "2001:db8::2"), 429);
    EXPECT_THAT(Log("refused-log-ins.log"), HasSubstr("too many attempts with a setup token; try again in "))
        << "packaging/fail2ban looks for it";
    EXPECT_TRUE(users_.IsEmpty());
    EXPECT_EQ(guess(token, "2001:db8::3"), 200) << "a neighbour's guesses keep nobody out";
}

}  // namespace
}  // namespace lookhaven::api
