// SPDX-License-Identifier: Apache-2.0
//
// The shared number of a player: who may reach it, who owns it, and that sweeping never takes a living player's file.
#include "standalone/control/progress_file.h"

#include <array>
#include <filesystem>
#include <fstream>
#include <functional>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::control {
namespace {

class ProgressFileTest : public testing::Test {
  protected:
    bool Exists(int key) const { return std::filesystem::exists(folder_ / (std::to_string(key) + ".aa")); }
    // Runs act in another process; its result.
    static bool Elsewhere(const std::function<bool()>& act) {
        return test::WaitFor(test::InChild([&] { _exit(act() ? 0 : 1); })) == 0;
    }

    const test::TemporaryFolder root_;
    const std::filesystem::path folder_ = root_ / "progress";
};

TEST_F(ProgressFileTest, IsSharedWithinASessionAlone) {
    EXPECT_FALSE(ProgressFile::Open(folder_, 7, "aa")) << "there is none yet";
    auto player = ProgressFile::Own(folder_, 7, "aa");
    ASSERT_TRUE(player);
    EXPECT_EQ(player->Get(), ProgressFile::kUnset);
    EXPECT_TRUE(Elsewhere([&] { return ProgressFile::Open(folder_, 7, "aa")->Set(4); }));
    EXPECT_EQ(player->Get(), 4);
    for (const char* foreign : {"bb", "a", "aaa", ""}) {
        EXPECT_FALSE(ProgressFile::Open(folder_, 7, foreign)) << foreign;
        EXPECT_TRUE(ProgressFile::Own(folder_, 7, foreign)->Set(9)) << foreign << " has its own under the same key";
    }
    EXPECT_EQ(player->Get(), 4);
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder_), {}), 5) << "nothing half made is left";
}

TEST_F(ProgressFileTest, PassesToTheNewerPlayer) {
    auto older = ProgressFile::Own(folder_, 7, "aa");
    ASSERT_TRUE(older->Set(4));
    auto client = ProgressFile::Open(folder_, 7, "aa");
    // The newer one is another process; it waits there until it has been looked at.
    EXPECT_TRUE(Elsewhere([&] {
        auto newer = ProgressFile::Own(folder_, 7, "aa");
        return newer && newer->Get() == ProgressFile::kUnset && newer->Set(2) && newer->Get() == 2;
    }));
    EXPECT_FALSE(older->Set(9));
    EXPECT_EQ(older->Get(), ProgressFile::kUnset);
    EXPECT_FALSE(client->Set(9)) << "it was for the older player";
    EXPECT_EQ(ProgressFile::Open(folder_, 7, "aa")->Get(), 2);
    ProgressFile::Sweep(folder_, 7, "aa", getpid());
    EXPECT_TRUE(Exists(7)) << "not its own any more";
}

TEST_F(ProgressFileTest, IsSweptOnceItsOwnerIsGone) {
    pid_t owner = 0;
    ASSERT_TRUE(Elsewhere([&] { return ProgressFile::Own(folder_, 7, "aa").has_value(); }));
    auto client = ProgressFile::Open(folder_, 7, "aa");
    std::ifstream(folder_ / "7.aa").ignore(4).read(reinterpret_cast<char*>(&owner), sizeof owner);
    ProgressFile::Sweep(folder_, 7, "aa", owner + 1);
    EXPECT_TRUE(client->IsCurrent());
    ProgressFile::Sweep(folder_, 7, "aa", owner);
    EXPECT_FALSE(Exists(7));
    EXPECT_FALSE(client->Set(1));
    ProgressFile::Sweep(folder_, 7, "aa", owner);
    EXPECT_TRUE(ProgressFile::Own(folder_, 7, "aa")) << "free again";
}

TEST_F(ProgressFileTest, RefusesWhatIsNoProgressFile) {
    std::filesystem::create_directories(folder_);
    std::ofstream(folder_ / "1.aa") << "short";
    std::ofstream(folder_ / "2.aa") << std::string(12, '\0');
    std::filesystem::create_symlink("/etc/passwd", folder_ / "3.aa");
    std::filesystem::create_directory(folder_ / "4.aa");
    ::mkfifo((folder_ / "5.aa").c_str(), 0600);
    for (int key = 1; key <= 5; ++key) {
        EXPECT_FALSE(ProgressFile::Own(folder_, key, "aa")) << key;
        EXPECT_FALSE(ProgressFile::Open(folder_, key, "aa")) << key;
        ProgressFile::Sweep(folder_, key, "aa", 0);
    }
}

// Players of one key come and go while the host sweeps each that has gone: each owns the key for a while.
TEST_F(ProgressFileTest, SurvivesSweepingWhileItIsTakenOver) {
    std::vector<pid_t> gone;
    for (int round = 0; round < 300; ++round) {
        std::array<int, 2> start{};
        ASSERT_EQ(pipe(start.data()), 0);
        const pid_t child = test::InChild([&] {
            char byte = 0;
            const bool started = read(start[0], &byte, 1) == 1;
            auto own = ProgressFile::Own(folder_, 7, "aa");
            const bool works = started && own && own->Set(round) && own->Get() == round &&
                               ProgressFile::Open(folder_, 7, "aa")->Get() == round;
            _exit(works ? 0 : 1);
        });
        ASSERT_EQ(write(start[1], "", 1), 1);
        for (const pid_t pid : gone) {
            ProgressFile::Sweep(folder_, 7, "aa", pid);
        }
        EXPECT_EQ(test::WaitFor(child), 0) << round;
        gone = {child};
        close(start[0]);
        close(start[1]);
    }
}

}  // namespace
}  // namespace lookhaven::control
