// SPDX-License-Identifier: Apache-2.0
//
// Maintenance of several mounts, one of which fails; a disk that hangs.
#include "standalone/recorder/recording_supervisor.h"

#include <atomic>
#include <thread>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/mounts.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

base::Installation Prepare(const std::filesystem::path& home) {
    base::Installation::CreateFolders(home);
    base::Installation installation(home);
    store::Store::Migrate(installation.StoreUrl());
    return installation;
}

TEST(RecordingSupervisor, DoesNotWaitForADiskThatHangs) {
    const test::ArchiveFolder home;
    const base::Installation installation = Prepare(home.Path());
    const std::filesystem::path disk = installation.RunFolder() / ("recordings." + std::to_string(getpid()) + ".new");
    ASSERT_EQ(mkfifo(disk.c_str(), 0600), 0);  // opening it for writing waits for a reader
    RecordingSupervisor supervisor(installation, std::chrono::seconds(1));
    std::atomic<bool> done = false;
    std::jthread second([&] {
        supervisor.DoEverySecond();
        done = true;
    });
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(5), [&] { return done.load(); }));
    supervisor.RequestStop();
    EXPECT_FALSE(supervisor.HasEnded()) << "the disk did not hang";
    const base::FileDescriptor reader = base::OpenFile(disk, O_RDONLY);
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return supervisor.HasEnded(); }));
}

TEST(RecordingSupervisor, MaintainsTheMountsBesideOneThatFails) {
    const test::ArchiveFolder home;
    const base::Installation installation = Prepare(home.Path());
    store::Store store = store::Store::Open(installation.StoreUrl());
    std::filesystem::create_directory(home / "disk");
    int id = 0;
    // Nobody can create a file in /proc.
    for (const std::filesystem::path& folder : {std::filesystem::path("/proc"), home / "disk"}) {
        store::Mount mount;
        mount.name = folder.filename();
        mount.path = folder;
        id = store::Mounts(store).Add(mount);
    }
    RecordingSupervisor supervisor(installation, std::chrono::seconds(1));
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] {
        return maintenance::MountFolder::Open(home / "disk", id).has_value();
    })) << "it was not given its marker";
    supervisor.RequestStop();
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return supervisor.HasEnded(); }));
}

}  // namespace
}  // namespace lookhaven::recorder
