// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Mount: a disk is added, told of, limited and removed, and what the pages are told where that fails.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/store/settings.h"
#include "test/support/footage/footage.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;

namespace {

TEST(MountApi, ADiskIsAddedToldOfLimitedAndRemoved) {
    const HostUnderTest host;
    const test::TemporaryFolder disks("lookhaven-disks");
    test::Footage footage(host.Home().StoreUrl(), disks.Path());
    maintenance::MountFolder::WriteMarker(footage.Mount(),
                                          maintenance::MarkerFor(footage.Records(), footage.MountId()));
    const std::int64_t start_s = base::WallSeconds() - 2 * 86'400;
    footage.Record(1, start_s, 60);
    store::Settings(footage.Records()).Set(store::kMountFoldersSetting, disks.Path().string());
    const std::string cookie = host.LogIn().secret;
    const auto ask_of = [&](const std::string& api, const std::string& method, const std::string& body) {
        return host.Ask("api=VEXO." + api + "&version=1&method=" + method, cookie,
                        {{"CONTENT_TYPE", "application/json"}}, body);
    };
    const auto ask = [&](const std::string& method, const std::string& body) { return ask_of("Mount", method, body); };
    const auto add = [&](const char* name) {
        std::filesystem::create_directory(disks.Path() / name);
        return ask("Add", R"({"limitDays": 1.5, "path": ")" + (disks.Path() / name).string() + "\"}");
    };
    const Answer added = add("second");
    EXPECT_EQ(added.status, 200) << added.body;
    const Json::Value mount = added.Json()["data"]["mount"];
    EXPECT_EQ(mount["name"], "second");
    EXPECT_EQ(mount["state"], "ready");
    EXPECT_EQ(mount["limit"]["days"], 1.5);
    EXPECT_EQ(mount["lastsDays"], 1.5);
    EXPECT_EQ(add("second").status, 400) << "another mount's";

    const Json::Value first = ask("List", "{}").Json()["data"]["mount"][0];
    EXPECT_EQ(first["oldest"].asInt64(), start_s);
    EXPECT_EQ(first["history"].size(), 30U);
    EXPECT_EQ(first["camera"][0]["id"], 1);
    EXPECT_GT(first["perDay"].asInt64(), first["used"].asInt64() / 7) << "of two days, not of seven";
    const std::string seen = R"({"id": 1, "revision": )" + first["revision"].asString();
    const Answer refused = ask("Set", seen + R"(, "limitDays": 1})");
    EXPECT_EQ(refused.Json()["data"]["confirm"]["events"], 1) << refused.body;
    EXPECT_EQ(ask("Set", seen + R"(, "limitDays": 0})").status, 400);
    EXPECT_EQ(ask("Set", seen + R"(, "limitBytes": "1T"})").status, 400);
    EXPECT_EQ(ask("Remove", seen + "}").status, 409) << "it holds footage";
    const Json::Value camera = ask_of("Camera", "List", "{}").Json()["data"]["camera"][0];
    const std::string lower = R"({"id": 1, "limitDays": 1, "revision": )" + camera["revision"].asString();
    EXPECT_EQ(ask_of("Camera", "Set", lower + "}").Json()["data"]["confirm"], refused.Json()["data"]["confirm"]);
    const Answer confirmed = ask_of("Camera", "Set", lower + R"(, "confirm": true})");
    EXPECT_EQ(confirmed.Json()["data"]["camera"]["limitDays"], 1.0) << confirmed.body;
    EXPECT_EQ(ask("Set", seen + R"(, "limitDays": 1, "confirm": true})").status, 200);
    EXPECT_EQ(ask("Set", seen + "}").Json()["error"]["data"]["limit"]["days"].asDouble(), 1);
    EXPECT_EQ(ask("Remove", R"({"id": 2, "revision": )" + mount["revision"].asString() + "}").status, 200);
    maintenance::WriteMountStatus(host.Home(), {{footage.MountId(), maintenance::MountState::kKeptFull, ""}});
    control::CommonConfigKeeper(host.Home()).Refresh(false);
    EXPECT_EQ(ask("List", "{}").Json()["data"]["mount"][0]["state"], "kept-full");
    std::filesystem::remove(footage.Mount() / maintenance::kMarkerName);
    EXPECT_EQ(ask("List", "{}").Json()["data"]["mount"][0]["state"], "absent");
}

}  // namespace
}  // namespace lookhaven::api
