// SPDX-License-Identifier: Apache-2.0
//
// Recorders of several hosts on one store: which of them records which camera, also when one of them is lost, cut off,
// or drained.
#include <algorithm>

#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/shared_mounts.h"
#include "test/component/recorder/hosts_fixture.h"

namespace lookhaven::test {
namespace {

TEST_F(HostsTest, CamerasOfAHostThatIsLostAreRecordedElsewhereAndStayThere) {
    StartHosts(3);
    const int fixed = AddCamera(1);
    for (int i = 0; i < 5; ++i) {
        AddCamera();
    }
    ASSERT_TRUE(Eventually(kLimit, [&] {
        const auto recorded = Recorded();
        return recorded.size() == 3 &&
               std::ranges::all_of(recorded, [](const auto& host) { return host.second.size() == 2; });
    })) << "two for each";
    ASSERT_TRUE(Recorded()[1].contains(fixed));
    machines_[0].Stop(SIGKILL);
    ASSERT_TRUE(Eventually(kLimit, [&] {
        auto recorded = Recorded();
        return recorded[2].size() + recorded[3].size() == 5;
    }));
    EXPECT_EQ(Holders()[fixed], 1) << "it waits for its host";
    const auto before = Holders();
    const int left_open = OpenEventOf(fixed);
    machines_[0].Start();
    ASSERT_TRUE(Eventually(kLimit, [&] {
        const int event = OpenEventOf(fixed);
        return event != 0 && event != left_open;
    }));
    auto expected = Recorded();
    expected[1] = {fixed};
    ASSERT_TRUE(EventuallyRecorded(expected));
    EXPECT_EQ(Holders(), before) << "they come back when an operator says so";
    for (Machine& machine : machines_) {
        machine.Stop(SIGTERM);
    }
    EXPECT_EQ(Recorded().size(), 0U);
    ExpectNeverRecordedTwice();
    ExpectSound();
}

TEST_F(HostsTest, AnOperatorMovesCamerasAndNoneIsRecordedTwice) {
    StartHosts(2);
    const int first = AddCamera();
    const int second = AddCamera();
    ASSERT_TRUE(EventuallyRecorded({{1, {first}}, {2, {second}}}));
    store::Hosts hosts(store_);
    store::Host host = *hosts.Find(1);
    host.draining = true;
    hosts.Update(host);
    ASSERT_TRUE(EventuallyRecorded({{2, {first, second}}}));
    host.draining = false;
    hosts.Update(host);
    store::CameraLeases(store_).Move(second, 1);
    ASSERT_TRUE(EventuallyRecorded({{1, {second}}, {2, {first}}}));
    store::Cameras cameras(store_);
    store::Camera fixed = *cameras.Find(first);
    fixed.host_id = 1;
    cameras.Update(fixed);
    ASSERT_TRUE(EventuallyRecorded({{1, {first, second}}}));
    fixed.enabled = false;
    cameras.Update(fixed);
    ASSERT_TRUE(Eventually(kLimit, [&] { return Holders()[first] == 0; }));
    for (Machine& machine : machines_) {
        machine.Stop(SIGTERM);
    }
    ExpectNeverRecordedTwice();
    ExpectSound();
}

TEST_F(HostsTest, AHostThatStoodStillLetsGoOfWhatOthersTook) {
    StartHosts(2);
    const int first = AddCamera();
    const int second = AddCamera();
    ASSERT_TRUE(EventuallyRecorded({{1, {first}}, {2, {second}}}));
    machines_[0].Signal(SIGSTOP);
    ASSERT_TRUE(Eventually(kLimit, [&] { return Recorded()[2].contains(first); }));
    machines_[0].Signal(SIGCONT);
    ASSERT_TRUE(EventuallyRecorded({{2, {first, second}}}));
    EXPECT_EQ(Holders(), (std::map<int, int>{{first, 2}, {second, 2}}));
    ExpectSound();
}

TEST_F(HostsTest, AStoreThatNobodyReachesMovesNothing) {
    StartHosts(2);
    const int first = AddCamera();
    const int second = AddCamera();
    ASSERT_TRUE(EventuallyRecorded({{1, {first}}, {2, {second}}}));
    const auto events = Recorded();
    std::set<int> ids;
    for (const store::Event& event : store::Events(store_).Open()) {
        ids.insert(event.id);
    }
    SetStoreUnreachable(true);
    const auto written = [this](std::size_t machine) {
        std::uintmax_t bytes = 0;
        for (const auto& file : fs::recursive_directory_iterator(machines_[machine].Folder())) {
            bytes += file.path().extension() == ".mkv" ? file.file_size() : 0;
        }
        return bytes;
    };
    const auto away_since = std::chrono::steady_clock::now();
    const std::uintmax_t before[] = {written(0), written(1)};
    ASSERT_TRUE(Eventually(kLimit, [&] {
        return std::chrono::steady_clock::now() - away_since > std::chrono::seconds(6) &&
               written(0) > before[0] + 50'000 && written(1) > before[1] + 50'000;
    })) << "recording continues";
    SetStoreUnreachable(false);
    store_ = store::Store::Open(url_);
    const auto heartbeats = [this] {
        std::vector<std::int64_t> counts;
        std::ranges::transform(store::Hosts(store_).All(), std::back_inserter(counts), &store::Host::heartbeat);
        return counts;
    };
    const auto counts = heartbeats();
    ASSERT_TRUE(Eventually(kLimit, [&] {
        const auto now = heartbeats();
        return now[0] > counts[0] + 8 && now[1] > counts[1] + 8;
    }));
    EXPECT_EQ(Holders(), (std::map<int, int>{{first, 1}, {second, 2}}));
    std::set<int> still;
    for (const store::Event& event : store::Events(store_).Open()) {
        still.insert(event.id);
    }
    EXPECT_EQ(still, ids) << "in the same events";
    EXPECT_EQ(Recorded(), events);
}

TEST_F(HostsTest, OneHostMaintainsASharedMountAndEachRecoversWhatItHasRecorded) {
    const TemporaryFolder folder;
    store::Mounts mounts(store_);
    const int mount = mounts.Add({.name = "shared", .path = fs::canonical(folder.Path()), .host_id = store::kAllHosts});
    maintenance::MountFolder::WriteMarker(folder, maintenance::MarkerFor(store_, mount));
    StartHosts(2);
    const int cameras[] = {AddCamera(1), AddCamera(2)};
    for (const int camera : cameras) {
        store::RecordingPlans(store_).Set(camera, {.mode = store::RecordMode::kAlways, .mount_id = mount});
    }
    store::SharedMounts shared(store_);
    ASSERT_TRUE(Eventually(kLimit, [&] {
        const auto open = store::Events(store_).Open();
        return shared.HostsWith(mount).size() == 2 && open.size() == 2 &&
               std::ranges::all_of(open, [&](const store::Event& event) { return event.mount_id == mount; });
    }));
    const int maintainer = shared.Lease(mount).host_id;
    ASSERT_TRUE(maintainer == 1 || maintainer == 2);
    const int other = 3 - maintainer;
    const int left_open = OpenEventOf(cameras[maintainer - 1]);
    const int growing = OpenEventOf(cameras[other - 1]);
    machines_[maintainer - 1].Stop(SIGKILL);
    ASSERT_TRUE(Eventually(
        kLimit, [&] { return machines_[other - 1].Log().find("this host maintains it now") != std::string::npos; }));
    EXPECT_EQ(shared.Lease(mount).host_id, other);
    const auto find = [&](int event) { return *store::Events(store_).Find(event); };
    const fs::path file = folder / find(left_open).path;
    machines_[maintainer - 1].Start();
    ASSERT_TRUE(Eventually(kLimit, [&] { return !find(left_open).recording; }));
    EXPECT_EQ(shared.Lease(mount).host_id, other) << "it stays";
    EXPECT_GT(find(left_open).frame_count, 0);
    EXPECT_EQ(OpenEventOf(cameras[other - 1]), growing) << "what the other is writing is no lost recording";
    store::Mount limited = *mounts.Find(mount);
    limited.max_bytes = 1;
    mounts.Update(limited);
    EXPECT_TRUE(Eventually(kLimit, [&] { return !fs::exists(file); }));
    const auto are_on_shared = [&](bool are) {
        const auto open = store::Events(store_).Open();
        return open.size() == 2 &&
               std::ranges::all_of(open, [&](const store::Event& event) { return (event.mount_id == mount) == are; });
    };
    const fs::path away = folder.Path().string() + ".away";
    fs::rename(folder.Path(), away);
    EXPECT_TRUE(Eventually(kLimit, [&] { return are_on_shared(false); })) << "each to its own mount meanwhile";
    fs::rename(away, folder.Path());
    EXPECT_TRUE(Eventually(kLimit, [&] { return are_on_shared(true); }));
    for (Machine& machine : machines_) {
        machine.Stop(SIGTERM);
    }
    ExpectNeverRecordedTwice();
    ExpectSound();
}

TEST_F(HostsTest, AMachineThatIsNoHostOrASecondOneOfItRecordsNothing) {
    StartHosts(1);
    const int camera = AddCamera();
    ASSERT_TRUE(EventuallyRecorded({{1, {camera}}}));
    Machine& copy = AddMachine();
    copy.BeHost(1);
    copy.Start();
    Machine& stranger = AddMachine();
    stranger.Start();
    EXPECT_TRUE(Eventually([&] { return copy.Log().find("records the cameras of this host") != std::string::npos; }));
    EXPECT_TRUE(
        Eventually([&] { return stranger.Log().find("this machine is not one of them") != std::string::npos; }));
    EXPECT_EQ(Recorded(), (std::map<int, std::multiset<int>>{{1, {camera}}}));
    store::Hosts(store_).Remove(1);
    EXPECT_TRUE(
        Eventually([&] { return machines_[0].Log().find("no host of this store any more") != std::string::npos; }));
}

}  // namespace
}  // namespace lookhaven::test
