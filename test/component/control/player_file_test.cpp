// SPDX-License-Identifier: Apache-2.0
//
// Player files: whose are read, and which are swept.
#include "standalone/control/player_file.h"

#include <fstream>
#include <functional>
#include <string>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::control {
namespace {

TEST(PlayerFile, OnlyOnesOwnAreReadAndThoseOfDeadProcessesAreSwept) {
    const pid_t dead = test::InChild([] {});
    test::WaitFor(dead);
    const test::TemporaryFolder folder;
    const std::string victim = folder / "victim";
    const std::string session = "abc" + std::to_string(::getpid());
    const std::string file = "/tmp/player_src.pid." + session;
    struct Row {
        const char* name;
        std::function<void()> make;
        pid_t read;
        bool stays;
    };
    for (const Row& row : {
             Row{"of a living player", [&] { std::ofstream(file) << ::getpid(); }, ::getpid(), true},
             Row{"of a dead player", [&] { std::ofstream(file) << dead; }, dead, false},
             Row{"empty", [&] { std::ofstream{file}; }, 0, false},
             Row{"a link", [&] { EXPECT_EQ(::symlink(victim.c_str(), file.c_str()), 0); }, 0, true},
             Row{"another name of a file", [&] { EXPECT_EQ(::link(victim.c_str(), file.c_str()), 0); }, 0, true},
             Row{"a pipe", [&] { EXPECT_EQ(::mkfifo(file.c_str(), 0600), 0); }, 0, true},
             Row{"another user's",
                 [&] {
                     std::ofstream(file) << dead;
                     EXPECT_TRUE(::geteuid() != 0 || ::chown(file.c_str(), 65534, 65534) == 0);
                 },
                 ::geteuid() != 0 ? dead : 0, ::geteuid() == 0},
         }) {
        SCOPED_TRACE(row.name);
        std::ofstream(victim) << dead;
        row.make();
        EXPECT_EQ(ReadPlayerFile(session), row.read);
        SweepPlayerFiles();
        struct stat status {};
        EXPECT_EQ(::lstat(file.c_str(), &status) == 0, row.stays);
        ::unlink(file.c_str());
    }
}

}  // namespace
}  // namespace lookhaven::control
