// SPDX-License-Identifier: Apache-2.0
#include "test/component/doctor/doctor_fixture.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <utility>

#include <sched.h>
#include <sys/mount.h>

#include "standalone/base/installation.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/segment.h"
#include "standalone/ring/writer.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/users.h"
#include "test/support/process.h"

namespace lookhaven::doctor {

namespace {

using testing::HasSubstr;

constexpr uid_t kNobody = 65534;

}  // namespace

void DoctorTest::SetUp() {
    DemoTest::SetUp();
    StartHost();
    if (is_root_) {
        std::filesystem::permissions(folder_, std::filesystem::perms(0755));
        Shell("chown -R 65534:65534 " + home_.string())();
    }
}

void DoctorTest::TearDown() {
    Shell("while umount " + Recordings() + " 2>/dev/null; do :; done")();
}

void DoctorTest::StartHost(const char* answer) {
    host_.reset();
    host_ = std::make_unique<cli::FakeHost>(cli::ListenAt(home_ / "run" / "webapi.sock"), answer);
}

cli::Outcome DoctorTest::Examine() {
    if (!recorder_) {
        recorder_.emplace(base::Installation(home_));
    }
    recorder_->Refresh(false);
    if (is_root_) {
        // Changes nothing where nothing is to be changed, for a folder may be read-only.
        Shell("find " + home_.string() + "/run ! -user 65534 -exec chown -h 65534:65534 {} +")();
    }
    return Run("doctor");
}

void DoctorTest::ExpectFoundAndMended(std::span<const Fault> faults, Severity severity) {
    const cli::Outcome sound = Examine();
    EXPECT_EQ(sound.code, 0) << sound.text;
    EXPECT_THAT(sound.text, testing::Not(testing::AnyOf(HasSubstr("problem"), HasSubstr("note"))));
    const bool is_note = severity == Severity::kNote;
    const std::string marker = Recordings() + "/.lookhaven-mount";
    for (const Fault& fault : faults) {
        if (!fault.can_be_made) {
            continue;
        }
        SCOPED_TRACE(fault.name);
        Shell("cp -p " + marker + " " + Recordings() + "-marker")();
        const std::set<std::string> before = Kept();
        fault.cause();
        const cli::Outcome outcome = Examine();
        EXPECT_EQ(outcome.code, is_note ? 0 : 1) << outcome.text;
        EXPECT_THAT(outcome.text, HasSubstr(fault.says));
        EXPECT_THAT(outcome.text, HasSubstr(is_note ? "note     " : "there is one problem"));
        fault.mend ? fault.mend() : DoWhatItSays(outcome);
        const cli::Outcome mended = Examine();
        EXPECT_EQ(mended.code, 0) << "still there\n" << mended.text;
        EXPECT_TRUE(!is_note || mended.text == sound.text) << "still there\n" << mended.text;
        const std::set<std::string> after = Kept();
        EXPECT_TRUE(std::ranges::includes(after, before)) << "something is lost";
    }
}

std::function<void()> DoctorTest::Sql(const std::string& statement) {
    return [this, statement] { CliTest::Sql({statement}); };
}

std::function<void()> DoctorTest::Shell(const std::string& command) {
    return [command] { EXPECT_EQ(std::system(command.c_str()), 0) << command; };
}

std::function<void()> DoctorTest::WriteStatus(const std::vector<maintenance::CameraStatus>& cameras) {
    return [this, cameras] { maintenance::WriteCameraStatus(base::Installation(home_), cameras); };
}

std::function<void()> DoctorTest::MakeCertificate(int days) {
    return Shell("cd " + home_.string() +
                 "/tls && openssl req -new -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes "
                 "-subj /CN=nvr -keyout key.pem -out request.pem 2>/dev/null && "
                 "openssl x509 -req -in request.pem -signkey key.pem -out certificate.pem 2>/dev/null -days " +
                 std::to_string(days) + " && chown --reference=. *.pem");
}

void DoctorTest::MakeOwnersCertificate() {
    Shell("cd " + home_.string() + " && mkdir own && cp -p tls/*.pem own && chown -R --reference=. own")();
}

void DoctorTest::LeaveSegment(std::uint32_t layout_version) const {
    test::WaitFor(test::InChild([&] {
        BecomeOwner();
        const base::Installation installation(home_);
        const ring::Writer writer(
            installation, {1, 0, base::Medium::kVideo},
            {.codec = "MJPEG", .extra_data = {}, .width = 64, .height = 48, .every_frame_is_key = true},
            ring::GeometryFor({.every_frame_is_key = true}));
        const ring::Attachment segment(ring::ListSegments(installation).at(0).shm_id);
        ring::View(segment.Address()).Head().constants.layout_version = layout_version;
        _exit(0);
    }));
}

bool DoctorTest::MayMount() {
    return ::geteuid() == 0 && ::unshare(CLONE_NEWNS) == 0 &&
           ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
}

void DoctorTest::BecomeOwner() const {
    if (is_root_ && ::setuid(kNobody) != 0) {
        _exit(1);
    }
}

void DoctorTest::DoWhatItSays(const cli::Outcome& outcome) {
    std::size_t begin = std::string::npos;
    for (const char* word : {"lookhaven ", "chmod ", "chown ", "mount -o ", "ipcrm "}) {
        begin = std::min(begin, outcome.text.find(word, outcome.text.find("do: ")));
    }
    ASSERT_NE(begin, std::string::npos) << outcome.text;
    std::string command = outcome.text.substr(begin, outcome.text.find_first_of(";\n", begin) - begin);
    for (const auto& [word, meaning] : {std::pair("NAME", std::string("rescuer")),
                                        {"ADDRESS", "test:mjpeg"},
                                        {"CERTIFICATE", home_ / "own/certificate.pem"},
                                        {"KEY", home_ / "own/key.pem"},
                                        {"FOLDER", home_ / "recordings-new"}}) {
        if (const std::size_t at = command.find(word); at != std::string::npos) {
            command.replace(at, std::strlen(word), meaning);
        }
    }
    if (command.starts_with("lookhaven ")) {
        const cli::Outcome done = Run(command.substr(std::strlen("lookhaven ")), "rescuer-s3cret\n");
        EXPECT_EQ(done.code, 0) << command << done.text;
    } else {
        Shell(command)();
    }
}

std::set<std::string> DoctorTest::Kept() {
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

}  // namespace lookhaven::doctor
