// SPDX-License-Identifier: Apache-2.0
//
// lookhaven host: machines that share one store, and what is each one's own.
#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <optional>

#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/shared_mounts.h"
#include "test/component/cli/program.h"
#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::cli {
namespace {

TEST_F(CliTest, AMachineOnSqliteIsNoHost) {
    SetUpDemo();
    Play({{"host add --name nvr1 --address nvr1.example", 65, "store move"}, {"host list --json", 0, "[]"}});
    EXPECT_EQ(base::Installation(home_).HostId(), 0);
}

class CliHostsTest : public CliTest {
  protected:
    CliHostsTest() : url_(server_.NewDatabase()) {
        MakeHome(home_);
        SetUpDemo();
    }

    void MakeHome(const std::filesystem::path& home) const {
        base::Installation::CreateFolders(home);
        std::ofstream(home / "store") << url_ << "\n";
        const std::string tls = (home / "tls").string();
        const std::string command = "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -days 9"
                                    " -subj /CN=nvr -keyout " +
                                    tls + "/key.pem -out " + tls + "/certificate.pem 2>/dev/null";
        ASSERT_EQ(std::system(command.c_str()), 0);
    }
    // Its recorder runs and has room, as far as the store says.
    void RunRecorder(int host) {
        store::RecorderLease lease(store(), host);
        ASSERT_TRUE(lease.Take(lease.Current().count, "recorder", 7));
        store::Hosts(store()).Report({.id = host, .room = store::HostRoom::kFree, .processors = 2});
    }
    store::Store& store() {
        if (!store_) {
            store_.emplace(store::Store::Open(url_));
        }
        return *store_;
    }

    test::TemporaryPostgres server_;
    const std::string url_;
    std::optional<store::Store> store_;
};

TEST_F(CliHostsTest, TheFirstOneKeepsItsMountsAndOthersAddTheirOwn) {
    const std::string added = "host add --name nvr1 --address nvr1.example --port 9443";
    Play({{"host add --name any --address nvr1.example", 65, "every host"},
          {"host add --name nvr1 --address 'nvr 1'", 65, "host name"},
          {added, 0, "Added this machine as host nvr1 with id"},
          {"host add --name nvr1 --address nvr1.example", 0, "Changed this machine as host nvr1"},
          {"host list", 0, "nvr1.example"},
          {"audit", 0, "host.add"},
          {"store move sqlite:" + (folder_ / "moved.db").string(), 65, "hosts share this store"}});
    const base::Installation installation(home_);
    const int first = installation.HostId();
    for (const store::Mount& mount : store::Mounts(store()).List()) {
        EXPECT_EQ(mount.host_id, first) << mount.name;
    }
    EXPECT_EQ(store::Hosts(store()).Find(first)->port, 8443);
    installation.SetHostId(0);
    std::filesystem::create_directory(folder_ / "disk");
    const std::string add_mount = "mount add " + (folder_ / "disk").string() + " --name other";
    Play({{add_mount, 65, "not one of them"},
          {added, 65, "already a host"},
          {"host add --name nvr2 --address nvr2.example", 0, "Added"},
          {add_mount, 0, "Added mount other"},
          {"mount set 1 --take-over", 65, "another host's"}});
    EXPECT_EQ(store::Mounts(store()).List().back().host_id, installation.HostId());
    std::filesystem::create_directory(folder_ / "all");
    Play({{"mount add " + (folder_ / "all").string() + " --shared", 0, "Added mount all"},
          {"mount list", 0, "default shared"}});
    const store::Mount shared = store::Mounts(store()).List().back();
    EXPECT_EQ(shared.host_id, store::kAllHosts);
    store::SharedMounts(store()).SetPresence(shared.id, first, true);
    std::filesystem::create_directory(folder_ / "bare");
    Play({{"mount set " + std::to_string(shared.id) + " --path " + (folder_ / "bare").string() + " --take-over", 66,
           "not marked as the shared mount"},
          {"verify --repair", 1, "no host maintains it"}});
}

TEST_F(CliHostsTest, CamerasAreFixedDrainedAndBalanced) {
    Play({{"host add --name nvr1 --address nvr1.example", 0, "Added"},
          {"camera set 1 --host nvr9", 66, "no host"},
          {"camera set 1 --host nvr1", 0, "Changed"},
          {"camera list --json", 0, "\"host\""},
          {"host drain nvr9", 66, "no host"},
          {"host drain nvr1", 0, "nvr1 gives its cameras"},
          {"host list --json", 0, "\"draining\" : true"},
          {"host undrain nvr1", 0, "takes cameras again"},
          {"host balance", 0, "No camera has to move"}});
    const int first = base::Installation(home_).HostId();
    EXPECT_EQ(store::Cameras(store()).Find(1)->host_id, first);
    store::Host host = *store::Hosts(store()).Find(first);
    host.name = "nvr2";
    const int second = store::Hosts(store()).Add(host);
    RunRecorder(first);
    RunRecorder(second);
    store::CameraLeases leases(store());
    for (int i = 0; i < 4; ++i) {
        store::Cameras(store()).Add({.name = "Yard", .profiles = {{.source = "test:mjpeg"}}});
    }
    int floating = 0;
    for (const store::CameraLease& lease : leases.List()) {
        ASSERT_TRUE(leases.Take(lease, first, 0));
        floating += lease.fixed_host_id == 0 ? 1 : 0;
    }
    const auto report = [&](maintenance::HostState state) {
        maintenance::WriteHostStatus(base::Installation(home_), {{second, state, 0}});
    };
    control::CommonConfigKeeper(base::Installation(home_)).Refresh(false);
    report(maintenance::HostState::kOffline);
    Play({{"host balance", 0, "No camera has to move"}});
    report(maintenance::HostState::kOnline);
    Play({{"host balance", 0, std::to_string(floating / 2) + " cameras move"}});
    EXPECT_EQ(std::ranges::count(leases.List(), second, &store::CameraLease::next_host_id), floating / 2);
    EXPECT_EQ(leases.List().front().next_host_id, 0) << "it is fixed";
    leases.SetRates(first, {{1, 5'000'000}, {leases.List().back().camera_id, 1'000'000}});
    Play({{"host balance", 0, "4 cameras move"}, {"host list --json", 0, "\"bytes_per_second\" : "}});
}

TEST_F(CliHostsTest, AHostIsRemovedWithItsFootageOnlyWhenAnOwnerSaysSo) {
    Play({{"host add --name nvr1 --address nvr1.example", 0, "Added"}});
    store::Host host = *store::Hosts(store()).Find(base::Installation(home_).HostId());
    host.name = "nvr2";
    const int other = store::Hosts(store()).Add(host);
    const int mount = store::Mounts(store()).Add({.name = "far", .path = "/srv/far", .host_id = other});
    store::Event event;
    event.camera_id = 1;
    event.mount_id = mount;
    event.path = "1/a.mkv";
    store::Events(store()).AddAll(std::vector{event});
    Play({{"camera set 1 --host nvr2", 0, "Changed"},
          {"host remove nvr2", 65, "1 recordings"},
          {"host remove nvr2 --yes", 65, "cameras are fixed"},
          {"camera set 1 --host any", 0, "Changed"},
          {"verify", 0, "", "far"},
          {"host remove nvr2 --yes", 0, "Removed"},
          {"host remove nvr1", 0, "Removed"}});
    EXPECT_EQ(store::Mounts(store()).Find(mount)->host_id, other) << "its footage is still known to be there";
    EXPECT_EQ(store::Events(store()).Content(mount).events, 1);
    EXPECT_EQ(base::Installation(home_).HostId(), 0);
    EXPECT_EQ(store::Mounts(store()).Find(1)->host_id, 0) << "a single machine again";
}

}  // namespace
}  // namespace lookhaven::cli
