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
#include "standalone/ring/inventory.h"
#include "standalone/ring/writer.h"
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
    const maintenance::RecordingStatus refuses{.camera = 1,
                                               .state = maintenance::RecordingState::kNoSignal,
                                               .camera_name = "Entrance",
                                               .lost_since_s = 1,
                                               .loss = base::SignalLoss::kWrongPassword,
                                               .loss_reason = "cannot open: 401"};
    const Fault faults[] = {
        {"camera that is down", WriteStatus({refuses}), "(Entrance) has sent no picture since ",
         [&] {
             EXPECT_EQ(Run("camera set 1 --account root", "camera-s3cret\n").code, 0);
             WriteStatus({})();
         }},
        {"another recorder", Sql("update recorder_lease set holder = '/var on nvr2'"), "/var on nvr2",
         Sql("update recorder_lease set holder = ''")},
        {"mute host", [&] { StartHost(""); }, "do: start the server", [&] { StartHost(); }},
        {"no host", [&] { std::filesystem::remove(socket); }, "the web API host does not answer", [&] { StartHost(); }},
        {"expired certificate", MakeCertificate(0), "has expired", MakeCertificate(90)},
        {"damaged certificate", Shell(": > " + home_.string() + "/tls/certificate.pem"),
         "cannot be used: ", MakeCertificate(90)},
        {"no web server",
         [&] { std::ofstream(home_ / "run/nginx.conf") << "    listen 127.0.0.1:" << port << " sndbuf=192k;\n"; },
         "the web server does not answer",
         [&] { web = std::make_unique<cli::FakeHost>(std::move(web_port), "HTTP/1.1 200"); }},
        {"lost host",
         [&] {
             store::RecordingServer annex{.name = "Annex", .address = "127.0.0.1", .port = 1};
             annex.certificate = base::ReadFile(home_ / "tls/certificate.pem");
             store::Store store = Open();
             store::RecordingServers(store).Add(annex, std::string(64, 'a'));
         },
         "Annex at 127.0.0.1 port 1 fails: ", [&] { EXPECT_EQ(Run("server set 1 --disable").code, 0); }},
    };
    ExpectFoundAndMended(faults);
}

TEST_F(DoctorTest, ASilentRecorderAndALeftSegmentAreFound) {
    EXPECT_THAT(Run("doctor").text, HasSubstr("the recorder has not run"));
    const base::Installation installation(home_);
    test::WaitFor(test::InChild([&] {
        BecomeOwner();
        const ring::Writer writer(
            installation, {1, 0, base::Medium::kVideo},
            {.codec = "MJPEG", .extra_data = {}, .width = 64, .height = 48, .every_frame_is_key = true},
            ring::GeometryFor({.every_frame_is_key = true}));
        _exit(0);  // as if killed
    }));
    const cli::Outcome outcome = Examine();
    EXPECT_EQ(outcome.code, 1) << outcome.text;
    EXPECT_THAT(outcome.text, HasSubstr("of camera 1 was left behind"));
    EXPECT_THAT(Run("doctor --json").text, HasSubstr("\"remedy\" : \"start the recorder"));
    EXPECT_EQ(test::WaitFor(test::InChild([&] {
                  BecomeOwner();
                  _exit(ring::RemoveOrphans(installation) == 1U ? 0 : 1);
              })),
              0);
    EXPECT_EQ(Examine().code, 0);
}

}  // namespace
}  // namespace lookhaven::doctor
