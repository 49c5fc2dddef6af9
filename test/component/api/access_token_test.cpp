// SPDX-License-Identifier: Apache-2.0
//
// Access tokens: what each of them may do, and that nothing else is to be had with one.
#include "standalone/admin/access_tokens.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/store/marks.h"
#include "standalone/store/settings.h"
#include "test/component/api/event_fixture.h"

namespace lookhaven::api {

namespace {

const std::string kMark = "VEXO.Event&version=1&method=Mark";

class AccessTokenApi : public EventApi {
  protected:
    std::string Add(const std::string& name, std::set<int> cameras, bool may_alert, std::int64_t age_s = 0) {
        store::AccessToken token;
        token.name = name;
        token.camera_ids = std::move(cameras);
        token.may_alert = may_alert;
        token.may_pos = true;
        return admin::AddAccessToken(footage_.Records(), {}, token, 3600, base::WallSeconds() - age_s).secret;
    }

    Answer AskWith(const std::string& authorization, const std::string& query, const std::string& form,
                   const std::string& cookie = "") const {
        return host_.Ask("api=" + query, cookie, {{"HTTP_AUTHORIZATION", authorization}}, form);
    }
};

TEST_F(AccessTokenApi, ReportsAtItsCamerasAndDoesNothingElse) {
    const std::string till = Add("till", {1}, false);
    const std::string box = Add("box", {1, 2}, true);
    const std::string old = Add("old", {1}, true, 3600);
    const std::string with_till = "Bearer " + till;
    const std::string with_old = "Bearer " + old;
    const std::string pos = "kind=pos&camera=1";
    const std::string long_text = pos + "&text=" + std::string(8000, 'x');
    const std::string in_query = "&token=" + till + "&access_token=" + till + "&authorization=Bearer+" + till;
    const struct {
        std::string authorization;
        std::string query;
        std::string form;  // empty: a GET
        int status;
        std::string cookie = {};
    } rows[] = {
        {with_till, kMark, pos, 200},
        {"bEARER " + till, kMark, pos, 200},
        {with_till, kMark, long_text, 200},  // more than who is nobody may send
        {with_till, kMark, pos, 200, viewer_},
        {with_till, kMark, "kind=alert&camera=1", 403},
        {with_till, kMark, "kind=alert&camera=1", 403, admin_},  // a session adds nothing
        {with_till, kMark, "kind=pos&camera=2", 404, admin_},
        {with_till, kMark, "kind=pos&camera=99", 404},
        {with_till, kMark + "&privData=x", pos, 200},
        {"Bearer " + box, kMark, "kind=alert&camera=2", 200},
        {with_till, kMark, "", 405},
        {with_till, "VEXO.Event&version=1&method=List", "", 403, admin_},
        {with_till, "VEXO.Event&version=2&method=Mark", pos, 403},
        {with_till, "VEXO.Event&version=1&method=Stream", "camera=1", 403},
        {with_till, "VEXO.Auth&version=1&method=Status", "", 403, admin_},
        {with_till, "VEXO.Auth&version=1&method=Login", "account=admin&password=right+password", 403},
        {with_till, "VEXO.Token&version=1&method=List", "x=", 403, admin_},
        {with_till, "VEXO.System&version=1&method=Health", "", 403},
        {with_till, "VEXO.Emap&version=1&method=Add", std::string(2'000'000, 'x'), 413, admin_},
        {with_till, "VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play", "camera=1", 403, admin_},
        {with_till, "VEXO.Relay&version=1&method=Play", "camera=1", 403},
        {with_till, "Test&version=1&method=Success", "", 403, admin_},
        {with_till, "None&version=1&method=None", "", 403},
        {"", kMark + in_query, pos + in_query, 401},
        {"Basic " + till, kMark, pos, 401},
        {till, kMark, pos, 401},
        {"Bearer " + till.substr(4), kMark, pos, 401},          // some other server's, so nobody
        {"Bearer " + till.substr(4), kMark, pos, 200, admin_},  // ... beside a session
        {with_old, kMark, pos, 401, admin_},                    // what was to be a token does not fall back
        {with_till + "0", kMark, pos, 401},
        {with_till.substr(0, with_till.size() - 1), kMark, pos, 401},
        {"Bearer lht_", kMark, pos, 401},
        {"Bearer lht_" + till.substr(4, 16) + box.substr(20), kMark, pos, 401},  // another's behind this one's handle
        {with_till + "1", kMark, pos, 401},
        {with_till + "2", kMark, pos, 429},  // the sixth within a minute
        {with_till, kMark, pos, 200},        // whom others' attempts do not block
    };
    for (const auto& row : rows) {
        const Answer answer = AskWith(row.authorization, row.query, row.form, row.cookie);
        EXPECT_EQ(answer.status, row.status) << row.authorization << row.query << row.form.substr(0, 40) << answer.body;
        EXPECT_EQ(answer.body.find("lht_"), std::string::npos) << answer.body;
    }
    const std::string refused = base::ReadFile(host_.Home().LogFolder() / "refused-log-ins.log");
    EXPECT_NE(refused.find("\"token old\" from \"192.0.2.7\": expired access token\n"), std::string::npos) << refused;
    EXPECT_NE(refused.find("\"access token\" from \"192.0.2.7\": wrong access token\n"), std::string::npos) << refused;
    EXPECT_EQ(refused.find("too many attempts"), std::string::npos) << "they would fill the file";
    EXPECT_EQ(refused.find("lht_"), std::string::npos);
}

TEST_F(AccessTokenApi, IsNamedLimitedAndTakenBack) {
    const std::string till = "Bearer " + Add("till", {1}, false);
    const auto mark = [&] { return AskWith(till, kMark, "kind=pos&camera=1"); };
    store::Settings(footage_.Records()).Set("marks_per_day", "1");
    EXPECT_EQ(mark().Json()["data"]["reported_by"], "token till");
    EXPECT_EQ(mark().status, 429) << "its own share of the day";
    EXPECT_EQ(AskWith("Bearer " + Add("other", {1}, true), kMark, "kind=pos&camera=1").status, 200);
    EXPECT_GT(store::AccessTokens(footage_.Records()).Find(1)->last_use_s, 0);
    store::Cameras(footage_.Records()).Remove(1);
    EXPECT_EQ(mark().status, 404);
    EXPECT_EQ(Ask("Token&version=1&method=Remove", "id=1").status, 200);
    EXPECT_NE(mark().body.find("removed access token"), std::string::npos);
}

TEST_F(AccessTokenApi, AreGivenOutByManagersWithTheirPassword) {
    const std::string add = "Token&version=1&method=Add";
    const auto ask = [&](const std::string& json, bool as_viewer = false, const std::string& query = "") {
        return host_.Ask("api=VEXO." + add + query, as_viewer ? viewer_ : admin_,
                         {{"CONTENT_TYPE", "application/json"}}, json);
    };
    const std::string good = R"("name":"till","camera":[1],"kind":["pos"],"reauth":"right password")";
    const struct {
        std::string json;
        int status;
    } rows[] = {{R"({"lifetime":60,)" + good + "}", 200},
                {"{" + good + "}", 400},  // the name is taken
                {R"({"name":"a","camera":[1]})", 403},
                {R"({"name":"a","camera":[1],"reauth":"wrong"})", 403},
                {R"({"name":"a","camera":[1],"reauth":"right password","lifetime":-1})", 400},
                {R"({"name":"a","camera":[1],"reauth":"right password","lifetime":999999999})", 400},
                {R"({"name":"a","camera":[1],"reauth":"right password","kind":[]})", 400},
                {R"({"name":"a","camera":[1],"reauth":"right password","kind":["fire"]})", 400},
                {R"({"name":"a","camera":1,"reauth":"right password"})", 400},
                {R"({"name":"a","camera":[],"reauth":"right password"})", 400},
                {R"({"name":"a","camera":[99],"reauth":"right password"})", 404},
                {R"({"name":"","camera":[1],"reauth":"right password"})", 400}};
    std::string secret;
    for (const auto& row : rows) {
        const Answer answer = ask(row.json);
        EXPECT_EQ(answer.status, row.status) << row.json << answer.body;
        secret = secret.empty() ? answer.Json()["data"]["secret"].asString() : secret;
    }
    EXPECT_EQ(ask("{" + good + "}", true).status, 403) << "a viewer";
    EXPECT_EQ(ask("{}", false, "&reauth=x").status, 400) << "no password in an address";
    EXPECT_EQ(AskWith("Bearer " + secret, kMark, "kind=pos&camera=1").status, 200);
    const Json::Value listed = Ask("Token&version=1&method=List", "x=").Json()["data"]["token"];
    ASSERT_EQ(listed.size(), 1U) << listed;
    EXPECT_EQ(listed[0]["by"], "admin");
    EXPECT_EQ(listed[0]["kind"].size(), 1U);
    EXPECT_EQ(listed[0]["expires"].asInt64() - listed[0]["created"].asInt64(), 60);
    EXPECT_FALSE(listed[0]["lastUse"].isNull());
    EXPECT_EQ(Ask("Token&version=1&method=Remove", "id=2").status, 404);
}

}  // namespace

}  // namespace lookhaven::api
