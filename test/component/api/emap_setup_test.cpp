// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Emap and VEXO.Group as managers set them up: pictures of every kind, and everyone who may not.
#include <gtest/gtest.h>

#include "standalone/store/store.h"
#include "standalone/store/users.h"
#include "test/support/host/host_under_test.h"
#include "test/support/png.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;

namespace {

using test::Png;

constexpr std::size_t kMiB = std::size_t{1} << 20;
const std::string kJson = "application/json";

class EmapSetup : public testing::Test {
  protected:
    Answer Ask(const std::string& method, const std::string& body, const std::string& type = kJson,
               const std::string& account = "admin") const {
        const std::string cookie = account.empty() ? "" : host_.LogIn(account).secret;
        return host_.Ask("version=1&api=VEXO." + method, cookie, {{"CONTENT_TYPE", type}}, body);
    }
    Answer Upload(const std::string& method, const std::string& body, const std::string& account = "admin") const {
        return Ask("Emap&method=" + method, body, "image/png", account);
    }
    Json::Value List() const { return Ask("Emap&method=List", "{}").Json()["data"]["emap"]; }
    std::string Seen(int id) const {
        for (const Json::Value& map : List()) {
            if (map["id"] == id) {
                return map["revision"].asString();
            }
        }
        return "0";
    }
    std::size_t Files() const {
        const std::filesystem::directory_iterator files(host_.Home().Home() / "emaps");
        return static_cast<std::size_t>(std::distance(begin(files), end(files)));
    }

    const HostUnderTest host_;
    const std::string png_ = Png(40, 30, {250, 10, 10});
};

TEST_F(EmapSetup, AMapIsAddedChangedAndRemoved) {
    const Answer added = Upload("Add&name=Ground%20floor", png_);
    ASSERT_EQ(added.status, 200) << added.body;
    const Json::Value map = added.Json()["data"]["emap"];
    EXPECT_EQ(map["name"], "Ground floor");
    EXPECT_EQ(Upload("Add&name=2", png_).Json()["data"]["emap"]["name"], "2") << "a name that looks like a number";
    const std::string link = R"({"emap": 2, "items": [{"type": 1, "id": 1}], "revision": )" + Seen(2) + "}";
    EXPECT_EQ(Ask("Emap&method=SaveItems", link).status, 200);
    const Json::Value linked = List()[0];
    EXPECT_EQ(linked["linkedFrom"][0]["name"], "2");
    EXPECT_EQ(List()[1]["items"], 1);
    EXPECT_EQ(Ask("Emap&method=Rename", R"({"emap": 1, "name": "Yard", "revision": )" + Seen(1) + "}").status, 200);
    const Answer replaced = Upload("Picture&emap=1&revision=" + Seen(1), png_);
    EXPECT_EQ(replaced.Json()["data"]["emap"]["name"], "Yard") << replaced.body;
    EXPECT_NE(replaced.Json()["data"]["emap"]["picture"], map["picture"]);
    const Answer stale = Ask("Emap&method=Remove", R"({"emap": 1, "revision": )" + map["revision"].asString() + "}");
    EXPECT_EQ(stale.status, 409);
    EXPECT_EQ(stale.Json()["error"]["data"], List()[0]) << "as it is now, and what shows it";
    EXPECT_EQ(Ask("Emap&method=Remove", R"({"emap": 1, "revision": )" + Seen(1) + "}").status, 200);
    EXPECT_EQ(List().size(), 1U);
}

TEST_F(EmapSetup, WhatIsNoPictureOrNobodysToChangeIsRefused) {
    Upload("Add&name=Yard", png_);
    const std::string seen = Seen(1);
    const std::size_t files = Files();
    const std::string large = png_ + std::string(kMiB, ' ');
    const struct {
        const char* what;
        std::string method;
        std::string body;
        std::string account;
        int status;
    } rows[] = {
        {"no picture", "Add&name=x", "MZ hello", "admin", 400},
        {"a drawing with a script", "Add&name=x", "<svg><script>1</script></svg>", "admin", 400},
        {"half a picture", "Add&name=x", png_.substr(0, png_.size() / 2), "admin", 400},
        {"a bomb", "Add&name=x", Png(1, 1, {}, "", {60'000, 60'000}), "admin", 400},
        {"a large bomb", "Picture&emap=1&revision=" + seen, Png(1, 1, {}, "", {6'000, 5'000}), "admin", 400},
        {"no name", "Add", png_, "admin", 400},
        {"a name that is taken", "Add&name=Yard", png_, "admin", 400},
        {"a map that is not there", "Picture&emap=9&revision=1", png_, "admin", 404},
        {"no revision", "Picture&emap=1", png_, "admin", 400},
        {"a stale revision", "Picture&emap=1&revision=1", png_, "admin", 409},
        {"more than 20 MiB", "Add&name=x", png_ + std::string(20 * kMiB, ' '), "admin", 400},
        {"a viewer", "Add&name=x", png_, "guest", 403},
        {"a viewer's large one", "Add&name=x", large, "guest", 403},
        {"a viewer's of another method", "SaveItems", large, "guest", 413},
        {"nobody", "Add&name=x", png_, "", 401},
        {"nobody's large one", "Add&name=x", large, "", 401},
        {"a method that takes none", "Remove&emap=1&revision=" + seen, large, "admin", 413},
        {"the same, small", "Remove&emap=1&revision=" + seen, png_, "admin", 400},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        const Answer answer = Upload(row.method, row.body, row.account);
        EXPECT_EQ(answer.status, row.status) << answer.body;
    }
    for (const std::string& type : {kJson, std::string("application/x-www-form-urlencoded")}) {
        EXPECT_EQ(Ask("Emap&method=Add&name=x", "{" + std::string(2 * kMiB, ' ') + "}", type).status, 413) << type;
        EXPECT_EQ(Ask("Emap&method=Picture&emap=1&revision=" + seen, "{}", type).status, 400) << type;
    }
    EXPECT_EQ(host_.Ask("api=VEXO.Emap&version=1&method=MayUpload", host_.LogIn("guest").secret).status, 403);
    EXPECT_EQ(host_.Ask("api=VEXO.Emap&version=1&method=MayUpload", host_.LogIn().secret).status, 200);
    EXPECT_EQ(Seen(1), seen);
    EXPECT_EQ(Files(), files);
    EXPECT_TRUE(host::Eventually(std::chrono::seconds(5), [this] { return host_.RequestProcesses() == 0; }));
}

TEST_F(EmapSetup, AFileOfNearly20MiBIsTaken) {
    const std::string comment = test::PngChunk("tEXt", "Comment" + std::string(19 * kMiB, '\0'));
    EXPECT_EQ(Upload("Add&name=Yard", Png(40, 30, {}, comment)).status, 200);
    EXPECT_LT(std::filesystem::file_size(host_.Home().Home() / "emaps" / List()[0]["picture"].asString()), kMiB);
}

TEST_F(EmapSetup, AGroupIsAddedChangedAndRemovedOnTopOfWhatWasSeen) {
    const auto ask = [this](const std::string& method, const std::string& body, const char* account = "admin") {
        return Ask("Group&method=" + method, body, kJson, account);
    };
    const Json::Value group = ask("Add", R"({"name": "Yard"})").Json()["data"]["group"];
    {
        store::Store records = store::Store::Open(host_.Home().StoreUrl());
        store::Users users(records);
        users.DenyGroup(users.FindByName("guest").value().id, 1, {store::CameraAccess::kLive});
    }
    const Json::Value denied = ask("List", "{}").Json()["data"]["group"][0];
    EXPECT_EQ(denied["deniedTo"][0], "guest");
    const auto seen_as = [](const Json::Value& record) {
        return R"({"id": 1, "revision": )" + record["revision"].asString();
    };
    const std::string seen = seen_as(denied);
    const struct {
        std::string method;
        std::string body;
        int status;
    } rows[] = {
        {"Add", R"({"name": "Yard"})", 400},
        {"Add", R"({"name": 5})", 400},
        {"Add", R"({"name": "Shed", "camera": [99]})", 404},
        {"Add", R"({"name": "Shed", "camera": 1})", 400},
        {"Set", R"({"id": 1, "name": "Court"})", 400},
        {"Set", R"({"id": 9, "revision": 1})", 404},
        {"Remove", seen_as(group) + "}", 409},
        {"Set", seen + R"(, "camera": ["x"]})", 400},
        {"Set", seen + R"(, "name": "Court"})", 200},
        {"Set", seen + R"(, "name": "Court"})", 409},
        {"Remove", seen + "}", 409},
    };
    for (const auto& row : rows) {
        const Answer answer = ask(row.method, row.body);
        EXPECT_EQ(answer.status, row.status) << row.method << row.body << answer.body;
        EXPECT_EQ(ask(row.method, row.body, "guest").status, 403);
    }
    const Json::Value now = ask("List", "{}").Json()["data"]["group"][0];
    EXPECT_EQ(now["name"], "Court");
    EXPECT_EQ(ask("Set", seen + "}").Json()["error"]["data"], now);
    EXPECT_EQ(ask("Remove", seen_as(now) + "}").status, 200);
}

TEST_F(EmapSetup, DevicesAreAddedChangedAndRemovedOnTopOfWhatWasSeen) {
    const auto ask = [this](const std::string& method, const std::string& body, const char* account = "admin") {
        return Ask("Device&method=" + method, body, kJson, account);
    };
    const Json::Value added =
        ask("Add", R"({"kind": "io", "name": "Box", "port": [{"port": 5, "type": "out"}]})").Json()["data"]["device"];
    EXPECT_EQ(added["port"][0]["camera"], 0);
    const std::string seen = R"({"kind": "io", "id": 1, "revision": )" + added["revision"].asString();
    const std::string add = R"({"kind": "io", "name": "x", "port": )";
    const struct {
        std::string method;
        std::string body;
        int status;
    } rows[] = {
        {"Add", R"({"kind": "camera", "name": "x"})", 400},
        {"Add", R"({"kind": ["io"], "name": "x"})", 400},
        {"Add", R"({"kind": "door", "name": ""})", 400},
        {"Add", R"({"kind": "door", "name": "x", "camera": 99})", 404},
        {"Add", R"({"kind": "door", "name": "x", "port": [{"port": 0, "type": "in"}]})", 400},
        {"Add", add + "5}", 400},
        {"Add", add + "[5]}", 400},
        {"Add", add + R"([{"port": "0", "type": "in"}]})", 400},
        {"Add", add + R"([{"port": 0, "type": 1}]})", 400},
        {"Add", add + R"([{"port": 0, "type": "in", "camera": "x"}]})", 400},
        {"Add", add + R"([{"port": 64, "type": "in"}]})", 400},
        {"Add", add + R"([{"port": 1, "type": "in"}, {"port": 1, "type": "out"}]})", 400},
        {"Set", R"({"kind": "io", "id": 1, "name": "y"})", 400},
        {"Set", R"({"kind": "pos", "id": 1, "revision": 1})", 404},
        {"Set", seen + R"(, "name": "Case"})", 200},
        {"Set", seen + R"(, "name": "Case"})", 409},
        {"Remove", seen + "}", 409},
    };
    for (const auto& row : rows) {
        const Answer answer = ask(row.method, row.body);
        EXPECT_EQ(answer.status, row.status) << row.method << row.body << answer.body;
        EXPECT_EQ(ask(row.method, row.body, "guest").status, 403);
    }
    const Json::Value list = ask("List", "{}").Json()["data"]["device"];
    ASSERT_EQ(list.size(), 1U);
    EXPECT_EQ(list[0]["name"], "Case");
    EXPECT_EQ(list[0]["port"], added["port"]) << "what the call does not name stays";
    EXPECT_EQ(ask("Set", seen + "}").Json()["error"]["data"], list[0]);
    const std::string now = R"({"kind": "io", "id": 1, "revision": )" + list[0]["revision"].asString() + "}";
    EXPECT_EQ(ask("Remove", now).status, 200);
    EXPECT_EQ(ask("Remove", now).status, 404);
}

}  // namespace
}  // namespace lookhaven::api
