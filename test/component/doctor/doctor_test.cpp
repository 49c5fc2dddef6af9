// SPDX-License-Identifier: Apache-2.0
//
// The doctor: sees each thing that is wrong, is content when nothing is, and what it says to do mends the fault and
// loses nothing.
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <set>

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/recording_status.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/writer.h"
#include "standalone/store/cameras.h"
#include "standalone/store/connection.h"
#include "standalone/store/events.h"
#include "standalone/store/servers.h"
#include "standalone/store/users.h"
#include "test/component/cli/fake_host.h"
#include "test/component/cli/program.h"
#include "test/support/process.h"

namespace lookhaven::doctor {
namespace {

using cli::DemoTest;
using cli::FakeHost;
using cli::Outcome;
using testing::HasSubstr;

constexpr uid_t kNobody = 65534;

// What mends a fault; nothing: what the doctor says.
using Mend = std::function<void()>;

class DoctorTest : public DemoTest {
  protected:
    // Where the tests run as root, the installation is another user's, as with script/server.
    void SetUp() override {
        DemoTest::SetUp();
        StartHost();
        if (is_root_) {
            std::filesystem::permissions(folder_, std::filesystem::perms(0755));
            Shell("chown -R 65534:65534 " + home_.string())();
        }
    }
    void TearDown() override { Shell("while umount " + Recordings() + " 2>/dev/null; do :; done")(); }

    void StartHost(const char* answer = "Status: 401") {
        host_.reset();
        host_ = std::make_unique<FakeHost>(cli::ListenAt(home_ / "run" / "webapi.sock"), answer);
    }

    Outcome Examine() {
        control::CommonConfigKeeper(base::Installation(home_)).Refresh(false);
        if (is_root_) {
            Shell("chown 65534:65534 " + home_.string() + "/run/*")();
        }
        return Run("doctor");
    }

    // Causes and mends of faults.
    Mend Sql(const std::string& statement) {
        return [this, statement] {
            const std::string url = base::Installation(home_).StoreUrl();
            store::Connection(store::StoreAddress::Parse(url)).Write([&](soci::session& sql) { sql << statement; });
        };
    }
    static Mend Shell(const std::string& command) {
        return [command] { EXPECT_EQ(std::system(command.c_str()), 0) << command; };
    }
    Mend Tell(const std::vector<maintenance::RecordingStatus>& cameras) {
        return [this, cameras] { maintenance::WriteRecordingStatus(base::Installation(home_), cameras); };
    }
    Mend Certificate(int days) {
        return Shell("cd " + home_.string() +
                     "/tls && openssl req -new -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes "
                     "-subj /CN=nvr -keyout key.pem -out request.pem 2>/dev/null && "
                     "openssl x509 -req -in request.pem -signkey key.pem -out certificate.pem 2>/dev/null -days " +
                     std::to_string(days));
    }

    // The first command line that the outcome names as a remedy.
    void DoWhatItSays(const Outcome& outcome) {
        const std::size_t begin = std::min({outcome.text.find("lookhaven ", outcome.text.find("do: ")),
                                            outcome.text.find("chmod ", outcome.text.find("do: ")),
                                            outcome.text.find("chown ", outcome.text.find("do: ")),
                                            outcome.text.find("mount -o ", outcome.text.find("do: "))});
        ASSERT_NE(begin, std::string::npos) << outcome.text;
        std::string command = outcome.text.substr(begin, outcome.text.find_first_of(";\n", begin) - begin);
        for (const auto& [word, meaning] : {std::pair("NAME", "rescuer"), {"ADDRESS", "test:mjpeg"}}) {
            if (const std::size_t at = command.find(word); at != std::string::npos) {
                command.replace(at, std::strlen(word), meaning);
            }
        }
        if (command.starts_with("lookhaven ")) {
            const Outcome done = Run(command.substr(std::strlen("lookhaven ")), "rescuer-s3cret\n");
            EXPECT_EQ(done.code, 0) << command << done.text;
        } else {
            Shell(command)();
        }
    }

    // All that a remedy must not lose.
    std::set<std::string> Kept() {
        std::set<std::string> kept;
        store::Store store = Open();
        for (const store::User& user : store::Users(store).List()) {
            kept.insert("user " + user.name);
        }
        for (const store::Camera& camera : store::Cameras(store).List()) {
            kept.insert("camera " + camera.name);
        }
        store::EventFilter all;
        all.camera_ids = {1, 2, 3, 4};
        for (const store::Event& event : store::Events(store).List(all)) {
            kept.insert("event " + std::to_string(event.id));
        }
        for (const auto& entry : std::filesystem::recursive_directory_iterator(Recordings())) {
            kept.insert(entry.path().string());
        }
        return kept;
    }

    // Of the installation: what this process makes is then as the server's.
    void BecomeOwner() const {
        if (is_root_ && ::setuid(kNobody) != 0) {
            _exit(1);
        }
    }

    std::string Recordings() const { return (home_ / "recordings").string(); }

    const bool is_root_ = ::geteuid() == 0;
    const bool may_mount_ =
        is_root_ && ::unshare(CLONE_NEWNS) == 0 && ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
    std::unique_ptr<FakeHost> host_;
};

TEST_F(DoctorTest, EachFaultIsFoundAndItsRemedyMendsItAndLosesNothing) {
    const Outcome sound = Examine();
    EXPECT_EQ(sound.code, 0) << sound.text;
    EXPECT_THAT(sound.text, testing::Not(HasSubstr("problem")));

    const auto socket = home_ / "run" / "webapi.sock";
    const std::string database = (home_ / "lookhaven.db").string();
    const std::string recordings = Recordings();
    const std::string marker = recordings + "/.lookhaven-mount";
    int port = 0;
    base::FileDescriptor web_port = cli::BindPort(port);
    std::unique_ptr<FakeHost> web;
    const maintenance::RecordingStatus refuses{.camera = 1,
                                               .state = maintenance::RecordingState::kNoSignal,
                                               .camera_name = "Entrance",
                                               .lost_since_s = 1,
                                               .loss = base::SignalLoss::kWrongPassword,
                                               .loss_reason = "cannot open: 401"};
    const struct {
        const char* fault;
        std::function<void()> cause;
        const char* says;
        Mend mend = {};
        bool can_be_made = true;
    } rows[] = {
        {"open folder", Shell("chmod 755 " + home_.string()), "open to other users"},
        {"readable store", Shell("chmod 644 " + database), "lookhaven.db is open"},
        {"store of root", Shell("chown 0:0 " + database), "lookhaven.db belongs to root", {}, is_root_},
        {"malformed store",
         Shell("cp " + database + " " + database + "-backup && printf nothing | dd conv=notrunc of=" + database +
               " 2>/dev/null"),
         "do: stop the server, replace the store", Shell("cat " + database + "-backup > " + database)},
        {"newer store", Sql("update schema_version set version = 99"), "update Lookhaven",
         Sql("update schema_version set version = " + std::to_string(store::Store::SchemaVersion()))},
        // As before the last step in store/schema.cpp.
        {"older store",
         [&] {
             Sql("drop table preferences")();
             Sql("update schema_version set version = version - 1")();
         },
         "do: lookhaven init"},
        {"no manager", Sql("update users set privilege = 2 where name = 'admin'"), "no account may manage"},
        {"no live source", Sql("update cameras set live_profile = 2 where id = 1"), "camera 1 has no source"},
        {"no mount", Sql("delete from mounts"), "no mount to record to"},
        {"disabled mount", Sql("update mounts set enabled = 0"), "is disabled, so that 2 of the cameras"},
        {"unplugged disk", Shell("mv " + recordings + " " + recordings + "-disk && mkdir " + recordings),
         "do: mount its disk\n", Shell("rmdir " + recordings + " && mv " + recordings + "-disk " + recordings)},
        {"folder gone", Shell("mv " + recordings + " " + recordings + "-disk"), "is not there",
         Shell("mv " + recordings + "-disk " + recordings)},
        {"another's folder", Shell("echo lookhaven mount 2 of another > " + marker), "another mount or installation"},
        {"mount that its owner may not write to", Shell("chmod 500 " + recordings), "does not permit its owner"},
        {"mount of root", Shell("chown 0:0 " + recordings), "belongs to root and cannot", {}, is_root_},
        {"read-only mount",
         Shell("mount --bind " + recordings + " " + recordings + " && mount -o remount,bind,ro " + recordings),
         "mounted read-only",
         {},
         may_mount_},
        {"full mount",
         Shell("mount -t tmpfs -o size=5m tmpfs " + recordings + " && cp -p " + recordings + "-marker " + marker +
               " && chown 65534 " + recordings + " && head -c 4m /dev/zero > " + recordings + "/greedy"),
         "left, recording needs", Shell("rm " + recordings + "/greedy"), may_mount_},
        {"above the limit",
         [&] {
             Sql("update mounts set max_bytes = 10")();
             store::Store store = Open();
             store::Event event;
             event.camera_id = 1, event.mount_id = 2, event.size_bytes = 12;
             store::Events(store).AddAll(std::vector{event});
         },
         "above its limit", [&] { EXPECT_EQ(Run("mount set 2 --limit 1G").code, 0); }},
        {"kept footage that fills the limit",
         [&] {
             Sql("update mounts set max_bytes = 10")();
             store::Store store = Open();
             store::Event event;
             event.camera_id = 1, event.mount_id = 2, event.size_bytes = 10, event.kept = true;
             store::Events(store).AddAll(std::vector{event});
         },
         "whatever else is recorded is deleted at once", [&] { EXPECT_EQ(Run("mount set 2 --limit 1G").code, 0); }},
        {"camera that is down", Tell({refuses}), "(Entrance) has sent no picture since ",
         [&] {
             EXPECT_EQ(Run("camera set 1 --account root", "camera-s3cret\n").code, 0);
             Tell({})();
         }},
        {"another recorder", Sql("update recorder_lease set holder = '/var on nvr2'"), "/var on nvr2",
         Sql("update recorder_lease set holder = ''")},
        {"mute host", [&] { StartHost(""); }, "do: start the server", [&] { StartHost(); }},
        {"no host", [&] { std::filesystem::remove(socket); }, "the web API host does not answer", [&] { StartHost(); }},
        {"expired certificate", Certificate(0), "has expired", Certificate(90)},
        {"damaged certificate", Shell(": > " + home_.string() + "/tls/certificate.pem"),
         "cannot be used: ", Certificate(90)},
        {"disk that snapshots fill",
         [&] {
             maintenance::WriteMountStatus(base::Installation(home_),
                                           {{2, maintenance::MountState::kSpaceHeld, recordings}});
         },
         "gets no space back from deleted recordings",
         [&] { maintenance::WriteMountStatus(base::Installation(home_), {}); }},
        {"no web server",
         [&] { std::ofstream(home_ / "run/nginx.conf") << "    listen 127.0.0.1:" << port << " sndbuf=192k;\n"; },
         "the web server does not answer",
         [&] { web = std::make_unique<FakeHost>(std::move(web_port), "HTTP/1.1 200"); }},
        {"lost host",
         [&] {
             store::RecordingServer annex{.name = "Annex", .address = "127.0.0.1", .port = 1};
             annex.certificate = base::ReadFile(home_ / "tls/certificate.pem");
             store::Store store = Open();
             store::RecordingServers(store).Add(annex, std::string(64, 'a'));
         },
         "Annex at 127.0.0.1 port 1 fails: ", [&] { EXPECT_EQ(Run("server set 1 --disable").code, 0); }},
    };
    for (const auto& row : rows) {
        if (!row.can_be_made) {
            continue;
        }
        SCOPED_TRACE(row.fault);
        Shell("cp -p " + marker + " " + recordings + "-marker")();
        const std::set<std::string> before = Kept();
        row.cause();
        const Outcome outcome = Examine();
        EXPECT_EQ(outcome.code, 1) << outcome.text;
        EXPECT_THAT(outcome.text, HasSubstr(row.says));
        EXPECT_THAT(outcome.text, HasSubstr("there is one problem")) << outcome.text;
        row.mend ? row.mend() : DoWhatItSays(outcome);
        EXPECT_EQ(Examine().code, 0) << "still there\n" << Examine().text;
        const std::set<std::string> after = Kept();
        EXPECT_TRUE(std::ranges::includes(after, before)) << "something is lost";
    }
    Sql("update camera_profiles set source = 'https://cam/' where camera_id = 1")();
    Sql("update cameras set insecure = 1")();
    const Outcome noted = Examine();
    EXPECT_EQ(noted.code, 0) << noted.text;
    EXPECT_THAT(noted.text, HasSubstr("note     cameras\n         the HTTPS certificate of camera 1 is not verified"));
    EXPECT_THAT(Run("doctor --json").text, HasSubstr("\"severity\" : \"note\""));
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
    const Outcome outcome = Examine();
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
