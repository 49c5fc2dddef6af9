// SPDX-License-Identifier: Apache-2.0
#include "test/component/doctor/doctor_fixture.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <utility>

#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/users.h"

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
    control::CommonConfigKeeper(base::Installation(home_)).Refresh(false);
    if (is_root_) {
        Shell("chown -h 65534:65534 " + home_.string() + "/run/*")();
    }
    return Run("doctor");
}

void DoctorTest::ExpectFoundAndMended(std::span<const Fault> faults) {
    const cli::Outcome sound = Examine();
    EXPECT_EQ(sound.code, 0) << sound.text;
    EXPECT_THAT(sound.text, testing::Not(HasSubstr("problem")));
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
        EXPECT_EQ(outcome.code, 1) << outcome.text;
        EXPECT_THAT(outcome.text, HasSubstr(fault.says));
        EXPECT_THAT(outcome.text, HasSubstr("there is one problem")) << outcome.text;
        fault.mend ? fault.mend() : DoWhatItSays(outcome);
        EXPECT_EQ(Examine().code, 0) << "still there\n" << Examine().text;
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
                 std::to_string(days));
}

void DoctorTest::BecomeOwner() const {
    if (is_root_ && ::setuid(kNobody) != 0) {
        _exit(1);
    }
}

void DoctorTest::DoWhatItSays(const cli::Outcome& outcome) {
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
