// SPDX-License-Identifier: Apache-2.0
//
// The doctor: sees each thing that is wrong, says what to do, and is content when nothing is.
#include <cstring>
#include <fstream>
#include <functional>
#include <thread>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/writer.h"
#include "standalone/store/connection.h"
#include "standalone/store/events.h"
#include "test/component/cli/program.h"
#include "test/support/process.h"

namespace lookhaven::cli {
namespace {

using testing::HasSubstr;

// Stands for the web API host: answers whoever connects, or only accepts.
class FakeHost {
  public:
    FakeHost(const std::filesystem::path& path, bool answers)
        : listener_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
        ::unlink(path.c_str());
        EXPECT_EQ(::bind(listener_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
        ::listen(listener_.Get(), 8);
        thread_ = std::thread([this, answers] {
            for (;;) {
                const base::FileDescriptor connection(::accept(listener_.Get(), nullptr, nullptr));
                if (!connection) {
                    return;
                }
                std::string request(512, '\0');
                ::recv(connection.Get(), request.data(), request.size(), 0);
                if (answers && request.find("api=VEXO.Auth&version=1&method=Status") != std::string::npos) {
                    ::send(connection.Get(), "Status: 401", 11, MSG_NOSIGNAL);
                }
            }
        });
    }
    ~FakeHost() {
        ::shutdown(listener_.Get(), SHUT_RDWR);
        thread_.join();
    }

  private:
    base::FileDescriptor listener_;
    std::thread thread_;
};

class DoctorTest : public DemoTest {
  protected:
    void SetUp() override {
        DemoTest::SetUp();
        host_ = std::make_unique<FakeHost>(home_ / "run" / "webapi.sock", true);
    }

    Outcome Examine() {
        control::CommonConfigKeeper(base::Installation(home_)).Refresh(false);
        return Run("doctor");
    }

    // Causes and mends of faults.
    std::function<void()> Sql(const std::string& statement) {
        return [this, statement] {
            const std::string url = base::Installation(home_).StoreUrl();
            store::Connection(store::StoreAddress::Parse(url)).Write([&](soci::session& sql) { sql << statement; });
        };
    }
    std::function<void()> Permissions(const char* file, int bits) {
        return [=, this] { std::filesystem::permissions(home_ / file, std::filesystem::perms(bits)); };
    }

    std::unique_ptr<FakeHost> host_;
};

TEST_F(DoctorTest, EachFaultIsFoundWithItsRemedy) {
    const Outcome sound = Examine();
    EXPECT_EQ(sound.code, 0) << sound.text;
    EXPECT_THAT(sound.text, testing::Not(HasSubstr("problem")));

    const auto socket = home_ / "run" / "webapi.sock";
    const struct {
        const char* fault;
        std::function<void()> cause;
        const char* says;
        const char* remedy;
        std::function<void()> mend;
    } rows[] = {
        {"open folder", Permissions("", 0755), "open to other users", "chmod go=", Permissions("", 0700)},
        {"readable store", Permissions("lookhaven.db", 0644), "lookhaven.db is open",
         "chmod go=", Permissions("lookhaven.db", 0600)},
        {"newer store", Sql("update schema_version set version = 99"), "newer than this program", "update Lookhaven",
         Sql("update schema_version set version = " + std::to_string(store::Store::SchemaVersion()))},
        {"no manager", Sql("update users set privilege = 2 where name = 'admin'"), "no account may manage",
         "init --admin", Sql("update users set privilege = 0 where name = 'admin'")},
        {"no live source", Sql("update cameras set live_profile = 2 where id = 1"), "camera 1 has no source",
         "camera set", Sql("update cameras set live_profile = 0 where id = 1")},
        {"no mount", Sql("delete from mounts"), "no mount to record to", "lookhaven init",
         [&] { EXPECT_EQ(Run("init").code, 0); }},
        {"mount gone", [&] { std::filesystem::rename(home_ / "recordings", home_ / "away"); }, "is not there",
         "mount its disk", [&] { std::filesystem::rename(home_ / "away", home_ / "recordings"); }},
        {"another folder", [&] { std::filesystem::remove(home_ / "recordings" / ".lookhaven-mount"); },
         "its disk is not mounted", "do: mount its disk\n",
         [&] { std::ofstream(home_ / "recordings" / ".lookhaven-mount") << "lookhaven mount 2 of another\n"; }},
        {"another's folder", [] {}, "another mount or installation", "mount set 2 --take-over",
         [&] { EXPECT_EQ(Run("mount set 2 --take-over").code, 0); }},
        {"above the limit",
         [&] {
             Sql("update mounts set max_bytes = 10")();
             store::Store store = Open();
             store::Event event;
             event.camera_id = 1, event.mount_id = 2, event.size_bytes = 12;
             store::Events(store).AddAll(std::vector{event});
         },
         "above its limit", "raise the limit", Sql("delete from events")},
        {"another recorder", Sql("update recorder_lease set holder = '/var on nvr2'"), "/var on nvr2",
         "stop one of the two", Sql("update recorder_lease set holder = ''")},
        {"mute host", [&] { host_.reset(), host_ = std::make_unique<FakeHost>(socket, false); }, "does not answer",
         "start the server", [&] { host_.reset(); }},
        {"no host", [&] { std::filesystem::remove(socket); }, "does not answer", "start the server",
         [&] { host_ = std::make_unique<FakeHost>(socket, true); }},
    };
    for (const auto& row : rows) {
        row.cause();
        const Outcome outcome = Examine();
        row.mend();
        EXPECT_EQ(outcome.code, 1) << row.fault << outcome.text;
        EXPECT_THAT(outcome.text, HasSubstr(row.says)) << row.fault;
        EXPECT_THAT(outcome.text, HasSubstr(row.remedy)) << row.fault;
        EXPECT_THAT(outcome.text, HasSubstr("there is one problem")) << row.fault << outcome.text;
    }
    Sql("update camera_profiles set source = 'https://cam/' where camera_id = 1")();
    Sql("update cameras set insecure = 1")();
    const Outcome noted = Examine();
    EXPECT_EQ(noted.code, 0) << "after all is mended" << noted.text;
    EXPECT_THAT(noted.text, HasSubstr("note     cameras\n         the HTTPS certificate of camera 1 is not verified"));
}

TEST_F(DoctorTest, ASilentRecorderAndALeftSegmentAreFound) {
    EXPECT_THAT(Run("doctor").text, HasSubstr("the recorder has not run"));
    const base::Installation installation(home_);
    test::WaitFor(test::InChild([&] {
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
    EXPECT_EQ(ring::RemoveOrphans(installation), 1U);
    EXPECT_EQ(Examine().code, 0);
}

}  // namespace
}  // namespace lookhaven::cli
