// SPDX-License-Identifier: Apache-2.0
//
// Log thresholds: what is set of which category, who may, and what the audit log tells of it.
#include "standalone/admin/log_levels.h"

#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;
using testing::HasSubstr;

class LogLevelsTest : public store::StoreTest {
  protected:
    std::string Try(const Actor& actor, std::optional<std::int64_t> seen, const LogChange& change) {
        try {
            const Json::Value record = SetLogLevels(store_, installation_, actor, seen, change);
            return record == LogRecord(installation_) ? "done" : "another record";
        } catch (const Forbidden&) {
            return "forbidden";
        } catch (const Stale&) {
            return "stale";
        } catch (const store::InvalidRecord& error) {
            return error.what();
        }
    }

    const base::Installation installation_{folder_};
    const Actor manager_{store::Users(store_).Add("bob", "correct horse", store::Privilege::kManager).id, "bob", ""};
    const Actor viewer_{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
};

TEST_P(LogLevelsTest, HoldAtOnceForThoseCategoriesAlone) {
    EXPECT_EQ(LogRecord(installation_)["others"], "error") << "before anybody has set one";
    const std::int64_t first = LogRecord(installation_)["revision"].asInt64();
    const pid_t self = ::getpid();
    const struct {
        const Actor& actor;
        std::optional<std::int64_t> seen;
        LogChange change;
        const char* outcome;
    } rows[] = {
        {viewer_, {}, {.every = 6}, "forbidden"},
        {manager_, first, {.categories = {{32, 6}, {100, 3}}}, "done"},
        {manager_, first, {.every = 6}, "stale"},
        {manager_, {}, {.others = 4, .processes = {{self, 5}}}, "done"},
        {manager_, {}, {.categories = {{512, 6}}}, "log categories have the numbers 0 to 511"},
        {manager_, {}, {.every = 2}, "there is no log level 2"},
        {manager_, {}, {.processes = {{4'194'305, 6}}}, "there is no process 4194305"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Try(row.actor, row.seen, row.change), row.outcome);
    }
    const control::DebugLogConfig* config = control::MapDebugLog(installation_);
    ASSERT_NE(config, nullptr);
    EXPECT_EQ(config->category_level[32], 6);
    EXPECT_EQ(config->category_level[100], 3);
    EXPECT_EQ(config->category_level[68], 1) << "it has a name, so it is none of the others";
    EXPECT_EQ(config->category_level[101], 4);
    EXPECT_EQ(config->process[0].pid, self);
    const std::vector<std::string> entries = Audited();
    ASSERT_EQ(entries.size(), 2U);
    EXPECT_THAT(
        entries[1],
        HasSubstr(R"({"100":"warning","liveview":"debug","others":"error","player":"error","requests":"error"})"));
    EXPECT_THAT(entries[0], HasSubstr("\"process " + std::to_string(self) + "\":\"info\""));
    EXPECT_EQ(Try(manager_, {}, {.every = 1, .processes = {{self, 0}}}), "done");
    EXPECT_EQ(LogRecord(installation_)["revision"].asInt64(), first);
    EXPECT_TRUE(LogRecord(installation_)["process"].empty());
}

LOOKHAVEN_ON_BOTH_ENGINES(LogLevelsTest);

}  // namespace
}  // namespace lookhaven::admin
