// SPDX-License-Identifier: Apache-2.0
//
// What the doctor finds at what runs: cameras, recorder, web API host, web server and its certificate, paired hosts,
// and what a recorder that was killed has left.
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <utility>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/segment.h"
#include "standalone/store/servers.h"
#include "test/component/doctor/doctor_fixture.h"
#include "test/support/process.h"

namespace lookhaven::doctor {
namespace {

using testing::HasSubstr;

TEST_F(DoctorTest, FaultsOfWhatRunsAreFoundAndMendedWithoutLoss) {
    const auto socket = home_ / "run" / "webapi.sock";
    int port = 0;
    base::FileDescriptor web_port = cli::BindPort(port);
    std::unique_ptr<cli::FakeHost> web;
    const maintenance::CameraStatus refuses{.camera = 1,
                                            .state = maintenance::RecordingState::kNoSignal,
                                            .camera_name = "Entrance",
                                            .lost_since_s = 1,
                                            .loss = base::SignalLoss::kWrongPassword,
                                            .loss_reason = "cannot open: 401"};
    auto refused = refuses, untrusted = refuses, mount_gone = refuses, no_id = refuses, full = refuses;
    refused.loss = base::SignalLoss::kRefused;
    untrusted.loss = base::SignalLoss::kCertificate;
    mount_gone.lost_since_s = no_id.lost_since_s = full.lost_since_s = 0;
    mount_gone.state = maintenance::RecordingState::kMountGone;
    no_id.state = maintenance::RecordingState::kNoEventId;
    full.state = maintenance::RecordingState::kDiskFull;
    const auto configuration = (home_ / "run/nginx.conf").string();
    const Fault faults[] = {
        {"camera that is down", WriteStatus({refuses}), "(Entrance) has sent no picture since ",
         [&] {
             EXPECT_EQ(Run("camera set 1 --account root", "camera-s3cret\n").code, 0);
             WriteStatus({})();
         }},
        {"camera that has moved", WriteStatus({refused}), "do: switch the camera on",
         [&] {
             EXPECT_EQ(Run("camera set 1 --source test:mjpeg").code, 0);
             WriteStatus({})();
         }},
        {"camera of a foreign authority", WriteStatus({untrusted}), "do: have an authority that this machine trusts",
         [&] {
             EXPECT_EQ(Run("camera set 1 --insecure").code, 0);
             WriteStatus({})();
         }},
        {"camera whose disk is missing", WriteStatus({mount_gone}), "do: check that its mount is enabled",
         WriteStatus({})},
        {"camera whose disk is full", WriteStatus({full}), "do: free space on its mount's disk", WriteStatus({})},
        {"camera without event ids", WriteStatus({no_id}), "do: repair the store", WriteStatus({})},
        {"another recorder", Sql("update recorder_lease set holder = '/var on nvr2'"), "/var on nvr2",
         Sql("update recorder_lease set holder = ''")},
        {"mute host", [&] { StartHost(""); }, "do: start the server", [&] { StartHost(); }},
        {"no host", [&] { std::filesystem::remove(socket); }, "the web API host does not answer", [&] { StartHost(); }},
        {"expired certificate",
         [&] {
             MakeCertificate(90)();
             MakeOwnersCertificate();
             MakeCertificate(0)();
         },
         "has expired"},
        {"damaged certificate", Shell(": > " + home_.string() + "/tls/certificate.pem"),
         "cannot be used: ", MakeCertificate(90)},
        {"no web server", [&] { std::ofstream(configuration) << "    listen 127.0.0.1:" << port << " sndbuf=192k;\n"; },
         "the web server does not answer",
         [&] { web = std::make_unique<cli::FakeHost>(std::move(web_port), "HTTP/1.1 200"); }},
        {"web server that has ended",
         Shell("mv " + configuration + " " + configuration + "-kept && ln -s /none " + configuration),
         "the web server does not run", Shell("mv " + configuration + "-kept " + configuration)},
        {"no certificate", Shell("rm " + home_.string() + "/tls/certificate.pem"),
         "do: restart the server, which makes", MakeCertificate(90)},
        {"lost host",
         [&] {
             store::RecordingServer annex{.name = "Annex", .address = "127.0.0.1", .port = 1};
             annex.certificate = base::ReadFile(home_ / "tls/certificate.pem");
             store::Store store = Open();
             store::RecordingServers(store).Add(annex, std::string(64, 'a'));
         },
         "Annex at 127.0.0.1 port 1 fails: ", [&] { EXPECT_EQ(Run("server set 1 --disable").code, 0); }},
        {"segment of another version", [&] { LeaveSegment(99); }, "was created by another version"},
    };
    ExpectFoundAndMended(faults);
}

// Listens on this machine's IPv6 address, where it has one.
base::FileDescriptor BindIpv6(int& port) {
    base::FileDescriptor listener(::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    address.sin6_addr = in6addr_loopback;
    socklen_t size = sizeof address;
    if (::bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), size) != 0) {
        return {};
    }
    ::getsockname(listener.Get(), reinterpret_cast<sockaddr*>(&address), &size);
    port = ::ntohs(address.sin6_port);
    return listener;
}

TEST_F(DoctorTest, Ipv6IsNotedWhereTheMachineHasItAndTheWebServerDoesNot) {
    MakeCertificate(90)();
    int port = 0;
    int port_v6 = 0;
    base::FileDescriptor listener = cli::BindPort(port);
    base::FileDescriptor listener_v6 = BindIpv6(port_v6);
    const bool has_v6 = static_cast<bool>(listener_v6);
    const auto configuration = home_ / "run/nginx.conf";
    const cli::FakeHost web(std::move(listener), "HTTP/1.1 200");
    std::ofstream(configuration) << "    listen 127.0.0.1:" << port << ";\n";
    const char* const note =
        "note     web server\n         this machine has IPv6, where the web server does not listen";
    const cli::Outcome without = Examine();
    EXPECT_EQ(without.code, 0) << without.text;
    EXPECT_EQ(without.text.find(note) != std::string::npos, has_v6) << without.text;
    if (!has_v6) {
        GTEST_SKIP() << "this machine has no IPv6";
    }
    std::ofstream(configuration, std::ios::app) << "    listen [::]:" << port_v6 << ";\n";
    const cli::Outcome deaf = Examine();
    EXPECT_EQ(deaf.code, 1) << deaf.text;
    EXPECT_THAT(deaf.text, HasSubstr("the web server does not answer at ::1 port " + std::to_string(port_v6)));
    const cli::FakeHost web_v6(std::move(listener_v6), "HTTP/1.1 200");
    const cli::Outcome with = Examine();
    EXPECT_EQ(with.code, 0) << with.text;
    EXPECT_THAT(with.text, testing::Not(HasSubstr("IPv6")));
}

TEST_F(DoctorTest, AHostThatIsOfflineIsNamedAndAMachineThatIsNoneIsTold) {
    const auto add_host = [this](int id) {
        return Sql("insert into hosts (id, name, address, port, certificate, version, draining, has_room, heartbeat,"
                   " holder, first_reserved_id) values (" +
                   std::to_string(id) + ", 'nvr" + std::to_string(id) +
                   "', '192.0.2.7', 8443, '', '', 0, 1, 0, '', 1)");
    };
    const auto report = [this](maintenance::HostState of_other) {
        return [this, of_other] {
            maintenance::WriteHostStatus(base::Installation(home_),
                                         {{1, maintenance::HostState::kLocal, 0}, {2, of_other, 4}});
        };
    };
    const std::string host_file = home_.string() + "/host";
    const Fault faults[] = {
        {"not one of the hosts", add_host(1), "this machine is not one of the hosts", Sql("delete from hosts")},
        {"host that is offline",
         [&] {
             add_host(1)();
             add_host(2)();
             Sql("update mounts set host_id = 1")();
             Shell("echo 1 > " + host_file + " && chown --reference=" + home_.string() + " " + host_file)();
             report(maintenance::HostState::kOffline)();
         },
         "host nvr2 is offline", report(maintenance::HostState::kOnline)},
        {"further host without a mount",
         [&] {
             Sql("update mounts set host_id = 2")();
             Shell("mkdir " + Recordings() + "-new && chown --reference=" + home_.string() + " " + Recordings() +
                   "-new")();
         },
         "do: lookhaven mount add FOLDER\n"},
        {"shared mount on a host of which nothing is known",
         [&] {
             Sql("update mounts set host_id = -1, path = path || '-away' where host_id = 2")();
             Sql("insert into shared_mount_hosts (mount_id, host_id) select id, 2 from mounts where host_id = -1")();
             maintenance::WriteHostStatus(base::Installation(home_), {{1, maintenance::HostState::kLocal, 0}});
         },
         "-away is not there", report(maintenance::HostState::kOnline)},
    };
    ExpectFoundAndMended(faults);
    Sql("update hosts set version = 'v' || id")();
    add_host(3)();
    Sql("update hosts set holder = 'a' where id > 1")();
    Sql("insert into camera_leases (camera_id, host_id, count, next_host_id, bytes_per_second)"
        " select id, 2, 1, 0, 10000 / id / id from cameras")();
    const cli::Outcome noted = Examine();
    EXPECT_EQ(noted.code, 0) << noted.text;
    EXPECT_THAT(noted.text, HasSubstr("host nvr2 runs version v2, this one v1"));
    EXPECT_THAT(noted.text, HasSubstr("host nvr2 has more to do"));
}

TEST_F(DoctorTest, ASilentRecorderAndALeftSegmentAreFound) {
    EXPECT_THAT(Run("doctor").text, HasSubstr("the recorder has not run"));
    const base::Installation installation(home_);
    LeaveSegment(ring::kLayoutVersion);
    const cli::Outcome outcome = Examine();
    EXPECT_EQ(outcome.code, 1) << outcome.text;
    EXPECT_THAT(outcome.text, HasSubstr("of camera 1 was left behind"));
    EXPECT_THAT(Run("doctor --json").text, HasSubstr("\"remedy\" : \"start the recorder"));
    control::MapCommonConfig(installation)->timestamp_sec -= 600;  // of this process, which lives on
    const cli::Outcome hanging = Run("doctor");
    EXPECT_EQ(hanging.code, 1) << hanging.text;
    EXPECT_THAT(hanging.text, HasSubstr("the recorder hangs"));
    EXPECT_EQ(test::WaitFor(test::InChild([&] {
                  BecomeOwner();
                  _exit(ring::RemoveOrphans(installation) == 1U ? 0 : 1);
              })),
              0);
    EXPECT_EQ(Examine().code, 0);
}

}  // namespace
}  // namespace lookhaven::doctor
