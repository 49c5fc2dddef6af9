// SPDX-License-Identifier: Apache-2.0
//
// Maintenance of several mounts, one of which fails; a disk that hangs.
#include "standalone/recorder/recording_supervisor.h"

#include <future>

#include <gtest/gtest.h>

#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/mounts.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

TEST(RecordingReport, HoldsNobodyUpWhileTheDiskHangs) {
    std::promise<void> disk;
    std::vector<std::size_t> written;
    RecordingReport report([&, ready = disk.get_future().share()](const RecordingReport::States& states) {
        ready.wait();
        written.push_back(states.size());
    });
    for (const std::size_t cameras : {1U, 1U, 2U, 3U}) {
        report.Publish(RecordingReport::States(cameras));
    }
    report.RequestStop();
    EXPECT_FALSE(report.HasEnded()) << "it waits for the disk in its own thread";
    disk.set_value();
    ASSERT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return report.HasEnded(); }));
    EXPECT_EQ(written.back(), 3U);
}

TEST(RecordingSupervisor, MaintainsTheMountsBesideOneThatFails) {
    const test::ArchiveFolder home;
    base::Installation::CreateFolders(home.Path());
    const base::Installation installation(home.Path());
    store::Store::Migrate(installation.StoreUrl());
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
