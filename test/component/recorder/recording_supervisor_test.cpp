// SPDX-License-Identifier: Apache-2.0
//
// Maintenance of several mounts, one of which fails, threads that cannot be had, and a camera's first event.
#include "standalone/recorder/recording_supervisor.h"

#include <cerrno>
#include <limits>

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pthread.h>

#include "standalone/base/clock.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"
#include "test/support/wait.h"

namespace {

int g_threads_left = std::numeric_limits<int>::max();

}  // namespace

// In the place of the C library's: a machine that is out of threads.
extern "C" __attribute__((visibility("default"))) int
pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*run)(void*), void* argument) noexcept {
    static const auto real = reinterpret_cast<decltype(&pthread_create)>(::dlsym(RTLD_NEXT, "pthread_create"));
    return g_threads_left-- > 0 ? real(thread, attributes, run, argument) : EAGAIN;
}

namespace lookhaven::recorder {
namespace {

namespace fs = std::filesystem;

class RecordingSupervisorTest : public testing::Test {
  protected:
    RecordingSupervisorTest() { base::Installation::CreateFolders(home_.Path()); }

    int AddMount(const fs::path& folder, const std::string& owner) {
        fs::create_directory(folder);
        store::Mount mount;
        mount.name = folder.filename();
        mount.path = folder;
        mount.id = store::Mounts(store_).Add(mount);
        maintenance::MountFolder::WriteMarker(folder, {mount.id, owner});
        return mount.id;
    }

    void SetPath(int id, const fs::path& path) {
        store::Mount mount = store::Mounts(store_).Find(id).value();
        mount.path = path;
        store::Mounts(store_).Update(mount);
    }

    const test::ArchiveFolder home_;
    const base::Installation installation_{home_.Path()};
    store::Store store_{
        (store::Store::Migrate(installation_.StoreUrl()), store::Store::Open(installation_.StoreUrl()))};
};

TEST_F(RecordingSupervisorTest, LooksAfterTheMountsBesideOneThatFails) {
    const std::string own = maintenance::MarkerFor(store_, 1).installation;
    const int failing = AddMount(home_ / "failing", own);
    const int foreign = AddMount(home_ / "foreign", "somebody else's");
    const int copied = AddMount(home_ / "copied", own);
    maintenance::MountLock recorder_of_a_copy;
    EXPECT_TRUE(recorder_of_a_copy.Hold(home_ / "copied"));
    const int good = AddMount(home_ / "good", own);
    store::Events events(store_);
    for (const int mount : {failing, foreign, copied, good}) {  // what a crash left: its file is missing
        store::Event open;
        open.id = events.NextId();
        open.camera_id = 1;
        open.mount_id = mount;
        open.recording = true;
        open.path = "1/1970-01-01/000000-" + std::to_string(open.id) + ".mkv";
        events.Begin(open);
    }
    // A name that no disk knows: an error that does not mean that the folder is absent.
    SetPath(failing, home_ / std::string(300, 'x'));
    const fs::path bare = home_ / "bare";
    fs::create_directory(bare);
    store::Mount unplugged;
    unplugged.name = "unplugged";
    unplugged.path = bare;
    unplugged.id = store::Mounts(store_).Add(unplugged);

    RecordingSupervisor supervisor(installation_, std::chrono::seconds(1));
    CatalogContents catalog;
    catalog.mounts = {{failing, true}, {foreign, true}, {copied, true}, {good, true}, {unplugged.id, true}};
    const auto states = [&] {
        supervisor.Reconcile(catalog);
        supervisor.DoEverySecond({});
        std::string text;
        for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation_)) {
            text += std::string(NameOf(status.state)) + " ";
        }
        return text;
    };
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] {
        return states().find("failing not-mounted in-use ready") != std::string::npos && events.Open().size() == 3;
    })) << states();
    EXPECT_EQ(events.Open().front().mount_id, failing);
    EXPECT_TRUE(fs::is_empty(bare)) << "a mount point without its disk is never marked";
    SetPath(failing, home_ / "failing");
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return states(), events.Open().size() == 2; }))
        << "recovery is tried again";
    supervisor.RequestStop();
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return supervisor.HasEnded(); }));
    EXPECT_EQ(store::RecorderLease(store_).Current().holder, "") << "nobody need wait for it to expire";
}

TEST_F(RecordingSupervisorTest, AThreadThatCannotBeHadIsTriedAgainAndCostsNoOther) {
    const int mount = AddMount(home_ / "disk", maintenance::MarkerFor(store_, 1).installation);
    RecordingSupervisor supervisor(installation_, std::chrono::seconds(1));
    CatalogContents catalog;
    catalog.mounts = {{mount, true}};
    for (const int camera : {1, 2, 3}) {
        catalog.cameras[camera] = {"Camera", store::RecordMode::kAlways, 60, 0, 0, mount, home_ / "disk", "here"};
    }
    for (const int threads : {0, 2, 1, std::numeric_limits<int>::max()}) {
        const std::size_t before = supervisor.NeededStreams().size();
        g_threads_left = threads;
        EXPECT_NO_THROW(supervisor.Reconcile(catalog));
        EXPECT_EQ(supervisor.NeededStreams().size(), std::min<std::size_t>(3, before + static_cast<unsigned>(threads)));
    }
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] {
        supervisor.DoEverySecond({});
        const auto mounts = maintenance::ReadMountStatus(installation_);
        return mounts.size() == 1 && mounts[0].state == maintenance::MountState::kReady;
    })) << "its maintenance was tried again, too";
    const CameraSignal refused{"Camera", true, {{}, base::SignalLoss::kRefused, "Connection refused"}};
    EXPECT_TRUE(test::Eventually([&] {
        supervisor.DoEverySecond({{2, refused}});
        std::string states;
        for (const maintenance::CameraStatus& status : maintenance::ReadCameraStatus(installation_)) {
            states += NameOf(status.state) + std::string(status.lost_since_s > 0 ? " since " : " ");
        }
        return states == "ready no-signal since ready ";
    })) << "what is to be recorded and does not come";
    supervisor.RequestStop();
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return supervisor.HasEnded(); }));
}

TEST_F(RecordingSupervisorTest, FirstEventsGetTheirIdsWithoutWaitingForTheNextSecond) {
    const std::string own = maintenance::MarkerFor(store_, 1).installation;
    const int mount = AddMount(home_ / "disk", own);
    RecordingSupervisor supervisor(installation_, std::chrono::seconds(1));
    CatalogContents catalog;
    for (const int camera : {1, 2, 3}) {
        catalog.cameras[camera] = {"Camera", store::RecordMode::kAlways, 60, 0, 0, mount, home_ / "disk", own};
    }
    supervisor.Reconcile(catalog);
    media::Packet picture = test::MakeClip(test::kMjpeg).At(0);
    EXPECT_TRUE(test::Eventually([&] {
        picture.timestamp_us = base::MonotonicMicros();
        for (const int camera : {1, 2, 3}) {
            supervisor.QueueOf({camera, 0})->Push(picture, std::nullopt);
        }
        return store::Events(store_).Open().size() == 3;
    })) << "only the start asks for ids here";
    supervisor.RequestStop();
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return supervisor.HasEnded(); }));
}

}  // namespace
}  // namespace lookhaven::recorder
