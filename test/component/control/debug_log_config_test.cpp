// SPDX-License-Identifier: Apache-2.0
//
// The shared debug-log configuration: seen by running readers, and free of processes that are gone.
#include <fstream>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "standalone/control/debug_log_config.h"
#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::control {
namespace {

class DebugLogTest : public testing::Test {
  protected:
    const test::TemporaryFolder home_;
    const base::Installation installation_{home_};
};

std::vector<std::pair<int, int>> Processes(const DebugLogConfig& config) {
    std::vector<std::pair<int, int>> entries;
    for (int i = 0; i < config.process_count; ++i) {
        entries.emplace_back(config.process[i].pid, config.process[i].level);
    }
    return entries;
}

TEST_F(DebugLogTest, ARunningReaderSeesEveryChangeAndErrorsAtFirst) {
    EXPECT_EQ(MapDebugLog(installation_), nullptr);
    { DebugLogEditor editor(installation_); }
    const DebugLogConfig* config = MapDebugLog(installation_);
    ASSERT_NE(config, nullptr);
    EXPECT_THAT(config->category_level, testing::Each(1));
    {
        DebugLogEditor editor(installation_);
        editor.SetCategory(32, 4);
        editor.SetCategory(511, 6);
        EXPECT_THROW(editor.SetCategory(512, 6), std::out_of_range);
        EXPECT_THROW(editor.SetCategory(-1, 6), std::out_of_range);
    }
    const auto* words = reinterpret_cast<const std::int32_t*>(config);
    EXPECT_EQ(words[1 + 32], 4);
    EXPECT_EQ(words[512], 6);
    EXPECT_EQ(words[513], 0) << "no process has a threshold of its own";
    EXPECT_EQ(std::accumulate(words + 1, words + 513, 0), 510 + 4 + 6);
    EXPECT_EQ(std::filesystem::status(installation_.Home() / "debug-log").permissions(), std::filesystem::perms(0600));
}

TEST_F(DebugLogTest, DeadProcessesMakeRoomAndTheLastLevelOfAProcessHolds) {
    test::KilledChild child([] {});
    DebugLogEditor editor(installation_);
    editor.SetProcess(child.Pid(), 5);
    editor.SetProcess(::getpid(), 4);
    editor.SetProcess(::getpid(), 6);
    EXPECT_THAT(Processes(editor.Config()), testing::ElementsAre(std::pair(child.Pid(), 5), std::pair(::getpid(), 6)));
    child.Kill();
    editor.SetProcess(1, 3);
    EXPECT_THAT(Processes(editor.Config()), testing::ElementsAre(std::pair(::getpid(), 6), std::pair(1, 3)));
    EXPECT_TRUE(editor.RemoveProcess(::getpid()));
    EXPECT_FALSE(editor.RemoveProcess(::getpid()));
    EXPECT_THAT(Processes(editor.Config()), testing::ElementsAre(std::pair(1, 3)));
}

TEST_F(DebugLogTest, AFileOfAnotherKindIsNotReadAndIsMadeAnew) {
    for (const std::string& contents : {std::string("short"), std::string(8192, '\xff'), std::string(8192, '\0')}) {
        std::ofstream(installation_.Home() / "debug-log", std::ios::trunc) << contents;
        EXPECT_EQ(MapDebugLog(installation_), nullptr);
        { DebugLogEditor editor(installation_); }
        ASSERT_NE(MapDebugLog(installation_), nullptr);
        EXPECT_EQ(MapDebugLog(installation_)->process_count, 0);
        EXPECT_EQ(MapDebugLog(installation_)->category_level[0], 1);
    }
}

}  // namespace
}  // namespace lookhaven::control
