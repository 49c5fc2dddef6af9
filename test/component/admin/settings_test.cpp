// SPDX-License-Identifier: Apache-2.0
//
// Settings of the installation: what each may be, who may change it, and what the audit log tells of it.
#include "standalone/admin/settings.h"

#include "standalone/admin/change.h"
#include "standalone/store/audit_log.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::HasSubstr;

class SettingsTest : public store::StoreTest {
  protected:
    Json::Value Record(const std::string& name) {
        for (const Setting& setting : Settings()) {
            if (setting.name == name) {
                return SettingRecord(store_, setting);
            }
        }
        return {};
    }

    // "done", or what is thrown.
    std::string Try(const Actor& actor, const std::string& name, const Json::Value& value) {
        try {
            const Json::Value record = SetSetting(store_, actor, name, {}, value);
            return record["value"] == value && Record(name) == record ? "done" : "another value";
        } catch (const Forbidden&) {
            return "forbidden";
        } catch (const store::NotFound&) {
            return "not found";
        } catch (const store::InvalidRecord& error) {
            return error.what();
        }
    }

    const Actor manager_{store::Users(store_).Add("bob", "correct horse", store::Privilege::kManager).id, "bob",
                         "192.0.2.7"};
    const Actor viewer_{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
};

TEST_P(SettingsTest, TakeWhatTheirBoundsAllowFromThoseWhoMay) {
    const Actor operator_on_the_host;
    const struct {
        const char* name;
        Json::Value value;
        const Actor& actor;
        const char* outcome;
    } rows[] = {
        {"players_per_session", 16, manager_, "done"},
        {"players_per_session", 17, manager_, "players_per_session must be a number from 1 to 16"},
        {"players_per_session", 0, manager_, "must be a number from 1 to 16"},
        {"players_per_session", 2.5, manager_, "must be a number"},
        {"players_per_session", "9", manager_, "must be a number"},
        {"players_per_session", Json::Value(), manager_, "must be a number"},
        {"players_per_session", 9, viewer_, "forbidden"},
        {"marks_per_day", Json::Int64{1} << 40, manager_, "must be a number from 1 to 1000000"},
        {"login_port", 80, manager_, "forbidden"},
        {"marks_per_day", 1'000'000, operator_on_the_host, "done"},
        {"cms", true, manager_, "done"},
        {"cms", "on", manager_, "must be true or false"},
        {"mount_folders", "/mnt", manager_, "forbidden"},
        {"mount_folders", "/mnt:/srv", operator_on_the_host, "done"},
        {"mount_folders", "/mnt/", operator_on_the_host, "each begins with / and ends without"},
        {"mount_folders", 5, operator_on_the_host, "each begins with /"},
        {"monitor_token", "mine", manager_, "forbidden"},
        {"monitor_token", "mine", operator_on_the_host, "can only be replaced"},
        {"installation", "mine", operator_on_the_host, "not found"},
    };
    for (const auto& row : rows) {
        EXPECT_THAT(Try(row.actor, row.name, row.value), HasSubstr(row.outcome)) << row.name << ' ' << row.value;
    }
    EXPECT_EQ(store::Settings(store_).Find("cms"), "on") << "as the programs read it";
    EXPECT_EQ(store::Settings(store_).NumberOr("players_per_session", 0), 16);
}

TEST_P(SettingsTest, EachHasAValueBeforeAnybodySetIt) {
    for (const Setting& setting : Settings()) {
        const Json::Value record = SettingRecord(store_, setting);
        EXPECT_EQ(record["value"], record["initial"]) << setting.name;
        EXPECT_LE(record["min"], record["initial"]) << setting.name;
        EXPECT_TRUE(record["max"].isNull() || record["max"] >= record["initial"]) << setting.name;
    }
    store::Settings(store_).Set("players_per_session", "99");
    EXPECT_EQ(Record("players_per_session")["value"], 16) << "as the programs take it";
}

TEST_P(SettingsTest, AChangeIsInTheAuditLogAndATokenIsNot) {
    const std::int64_t seen = Record("players_per_session")["revision"].asInt64();
    SetSetting(store_, manager_, "players_per_session", seen, 7);
    EXPECT_THROW(SetSetting(store_, manager_, "players_per_session", seen, 8), Stale);
    EXPECT_THROW(SetMonitorToken(store_, manager_, true), Forbidden);
    const std::string first = SetMonitorToken(store_, {}, true);
    EXPECT_EQ(Record("monitor_token")["value"], true);
    EXPECT_EQ(store::Settings(store_).Find("monitor_token"), store::Digest(first));
    const std::string second = SetMonitorToken(store_, {}, true);
    EXPECT_EQ(SetMonitorToken(store_, {}, false), "");
    EXPECT_EQ(Record("monitor_token")["value"], false);
    std::vector<std::string> entries;
    std::string text;
    for (const store::AuditEntry& entry : store::AuditLog(store_).List(0, 9)) {
        entries.push_back(entry.who + ' ' + entry.action + ' ' + entry.object);
        text += entry.before + entry.after;
    }
    const std::string made = "command line setting.set monitor_token";
    EXPECT_THAT(entries, ElementsAre(made, made, made, "bob setting.set players_per_session"));
    EXPECT_THAT(text, HasSubstr(R"({"value":9}{"value":7})"));
    for (const std::string& token : {first, second, store::Digest(second)}) {
        EXPECT_EQ(text.find(token), text.npos);
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(SettingsTest);

}  // namespace
}  // namespace lookhaven::admin
