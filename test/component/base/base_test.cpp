// SPDX-License-Identifier: Apache-2.0
//
// What every process relies on: process identities, files that are replaced whole, the state folder.
#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <system_error>
#include <tuple>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/base/journal.h"
#include "standalone/base/log.h"
#include "standalone/base/moment.h"
#include "standalone/base/process.h"
#include "standalone/base/service_manager.h"
#include "test/support/folder.h"
#include "test/support/process.h"
#include "test/support/wait.h"

namespace lookhaven::base {
namespace {

class FileTest : public testing::Test {
  protected:
    const test::TemporaryFolder path_;
};

TEST(ProcessIdentityTest, ADeadProcessIsGoneEvenAsAZombieAndWhenItsIdIsReused) {
    test::KilledChild child([] {});
    const ProcessIdentity identity{child.Pid(), ProcessStartTicks(child.Pid())};
    EXPECT_TRUE(IsAlive(identity));
    EXPECT_FALSE(IsAlive({child.Pid(), identity.start_ticks + 1})) << "another process under the same id";
    EXPECT_FALSE(IsAlive({child.Pid(), 0}));
    EXPECT_FALSE(IsAlive({0, identity.start_ticks}));

    ::kill(child.Pid(), SIGKILL);
    siginfo_t info{};
    ::waitid(P_PID, static_cast<id_t>(child.Pid()), &info, WEXITED | WNOWAIT);
    EXPECT_FALSE(IsAlive(identity)) << "a zombie holds nothing any more";
    child.Kill();
    EXPECT_FALSE(IsAlive(identity));
}

TEST(ProcessIdentityTest, AProcessThatCannotBeLookedUpWithoutDescriptorsIsNotDead) {
    const ProcessIdentity self = ThisProcess();
    rlimit before{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
    const rlimit none{0, before.rlim_max};
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    const bool alive = IsAlive(self);
    EXPECT_THROW(ThisProcess(), std::runtime_error) << "nobody could tell whether such an owner lives";
    RaiseDescriptorLimit();
    rlimit raised{};
    ::getrlimit(RLIMIT_NOFILE, &raised);
    ::setrlimit(RLIMIT_NOFILE, &before);
    EXPECT_TRUE(alive);
    EXPECT_EQ(raised.rlim_cur, raised.rlim_max);
}

TEST(ProcessIdentityTest, ACommandNameWithParenthesesAndSpacesDoesNotShiftTheFields) {
    const std::uint64_t before = ThisProcess().start_ticks;
    const std::string name = ReadFile("/proc/self/comm");
    for (const char* hostile : {"a) R 1 1", "((( ", ") S 0 0 0 0 0 0"}) {
        FileDescriptor comm = OpenFile("/proc/self/comm", O_WRONLY);
        ASSERT_GT(::write(comm.Get(), hostile, std::string_view(hostile).size()), 0);
        EXPECT_EQ(ThisProcess().start_ticks, before) << hostile;
    }
    ASSERT_GT(::write(OpenFile("/proc/self/comm", O_WRONLY).Get(), name.data(), name.size()), 0);
}

TEST_F(FileTest, AnUpdateOfARunningProgramIsSeen) {
    const auto program = path_ / "sleep";
    std::filesystem::copy("/bin/sleep", program);
    const pid_t child = test::InChild([&] { ::execl(program.c_str(), "sleep", "1000", nullptr); });
    const auto running = "/proc/" + std::to_string(child) + "/exe";
    EXPECT_TRUE(test::Eventually([&] { return std::filesystem::read_symlink(running) == program; }));
    EXPECT_FALSE(IsProgramReplaced(child));
    EXPECT_NEAR(static_cast<double>(StartedAt({child, ProcessStartTicks(child)})), static_cast<double>(WallSeconds()),
                60);
    std::filesystem::copy("/bin/sleep", path_ / "new");
    std::filesystem::rename(path_ / "new", program);
    EXPECT_TRUE(IsProgramReplaced(child));
    test::KillAndWait(child);
    EXPECT_FALSE(IsProgramReplaced(child)) << "it is gone";
    EXPECT_EQ(StartedAt({child, ProcessStartTicks(child)}), 0);
}

TEST_F(FileTest, AFailedReplacementLeavesTheOldFile) {
    const auto file = path_ / "settings";
    WriteFileAtomically(file, "old", 0640);
    EXPECT_THROW(WriteFileAtomically(path_ / "missing" / "settings", "new"), std::system_error);
    std::filesystem::create_symlink("victim", path_ / ("settings." + std::to_string(::getpid()) + ".new"));
    WriteFileAtomically(file, std::string(100'000, 'x'));
    EXPECT_EQ(ReadFile(file), std::string(100'000, 'x'));
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(path_.Path()), {}), 1) << "no temporary file stays";
    EXPECT_THROW(ReadFile(path_ / "nothing"), std::system_error);
}

TEST_F(FileTest, TwoMappingsOfOneFileAreTheSameMemory) {
    SharedMapping first(path_ / "shared", 8192);
    const SharedMapping second(path_ / "shared", 4096);
    static_cast<char*>(first.Data())[4000] = 'z';
    EXPECT_EQ(static_cast<char*>(second.Data())[4000], 'z');
    EXPECT_EQ(std::filesystem::file_size(path_ / "shared"), 8192U) << "a smaller mapping does not cut the file";
    EXPECT_THROW(SharedMapping(path_ / "no" / "folder", 4096), std::system_error);
    std::filesystem::create_symlink("shared", path_ / "link");
    EXPECT_THROW(SharedMapping(path_ / "link", 4096), std::system_error);
}

TEST_F(FileTest, TheHostFileIsReadAsWrittenOrRefused) {
    Installation::CreateFolders(path_ / "home");
    const Installation installation(path_ / "home");
    EXPECT_EQ(installation.HostId(), 0);
    installation.SetHostId(12);
    EXPECT_EQ(installation.HostId(), 12);
    for (const char* text : {"", "\n", "0\n", "-1\n", "12", "12 \n", "x\n", "99999999999\n"}) {
        WriteFileAtomically(path_ / "home" / "host", text);
        EXPECT_THROW(installation.HostId(), std::system_error) << text;
    }
    installation.SetHostId(0);
    EXPECT_EQ(installation.HostId(), 0);
    installation.SetHostId(0);
}

TEST_F(FileTest, OneStateFolderIsOneInstallationUnderAnyName) {
    Installation::CreateFolders(path_ / "home");
    std::filesystem::create_directory_symlink(path_ / "home", path_ / "alias");
    Installation::CreateFolders(path_ / "other");
    EXPECT_EQ(Installation(path_ / "home").Id(), Installation(path_ / "alias").Id());
    EXPECT_NE(Installation(path_ / "home").Id(), Installation(path_ / "other").Id());
    EXPECT_EQ(std::filesystem::status(path_ / "home").permissions(), std::filesystem::perms::owner_all);
    EXPECT_THROW(Installation(path_ / "nowhere"), std::system_error);

    WriteFileAtomically(path_ / "home" / "store", "postgresql://host/db\n");
    EXPECT_EQ(Installation(path_ / "home").StoreUrl(), "postgresql://host/db");
    EXPECT_EQ(Installation(path_ / "other").StoreUrl(), "sqlite:" + (path_ / "other" / "lookhaven.db").string());
}

TEST_F(FileTest, TheServiceManagerIsToldWhereItListens) {
    const std::string file = (path_ / "notify").string();
    for (const std::string& name : {file, "@" + file}) {
        const FileDescriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0));
        sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
        name.copy(address.sun_path, name.size());
        std::replace(address.sun_path, address.sun_path + 1, '@', '\0');
        const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + name.size());
        ASSERT_EQ(::bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), size), 0) << name;
        ::setenv("NOTIFY_SOCKET", name.c_str(), 1);
        NotifyReady();
        std::array<char, 64> told{};
        EXPECT_EQ(::recv(socket.Get(), told.data(), told.size(), 0), 7) << name;
        EXPECT_STREQ(told.data(), "READY=1");
    }
    ::unsetenv("NOTIFY_SOCKET");
    NotifyReady();
}

TEST(ServiceManagerTest, TheWatchdogsLimitIsHalvedAndNoOtherProcesss) {
    using std::chrono::milliseconds;
    const std::string own = std::to_string(::getpid());
    for (const auto& [limit_us, process, interval] : {std::tuple{"30000000", own, milliseconds(15'000)},
                                                      {"30000000", std::string("1"), milliseconds(3'600'000)},
                                                      {"0", own, milliseconds(3'600'000)},
                                                      {"soon", own, milliseconds(3'600'000)}}) {
        ::setenv("WATCHDOG_USEC", limit_us, 1);
        ::setenv("WATCHDOG_PID", process.c_str(), 1);
        EXPECT_EQ(AliveInterval(), interval) << limit_us << ' ' << process;
    }
    ::unsetenv("WATCHDOG_USEC");
    ::unsetenv("WATCHDOG_PID");
}

TEST(LogTest, ALineSteersNoTerminal) {
    testing::internal::CaptureStderr();
    base::LogInfo("a\nb\x1b[2J\xc2\x9b"
                  "2J\xc3\x9b\xc2\xa0\xc2");
    const std::string line = testing::internal::GetCapturedStderr();
    EXPECT_TRUE(line.ends_with(" info: a b [2J  2J\xc3\x9b\xc2\xa0\xc2\n")) << line;
}

TEST(LogTest, TheJournalIsKnownByStandardErrorItself) {
    struct stat status {};
    ASSERT_EQ(::fstat(STDERR_FILENO, &status), 0);
    const std::string own = std::to_string(status.st_dev) + ':' + std::to_string(status.st_ino);
    ::unsetenv("JOURNAL_STREAM");
    EXPECT_FALSE(LogsToJournal());
    for (const auto& [stream, is_journal] : {std::pair{own, true}, {own + "1", false}, {std::string(), false}}) {
        ::setenv("JOURNAL_STREAM", stream.c_str(), 1);
        EXPECT_EQ(LogsToJournal(), is_journal) << stream;
    }
    ::unsetenv("JOURNAL_STREAM");
}

TEST_F(FileTest, TheJournalGetsFieldsOfWhatThereIs) {
    const std::string path = path_ / "socket";
    const JournalEntry camera{3, "recorder", "camera 5: no signal", 5};
    const JournalEntry account{6, "request", "=\xc3\xa4", 0, "J\xc3\xb6rg @ home"};
    EXPECT_FALSE(SendToJournal(camera, path.c_str())) << "nobody listens";
    const FileDescriptor journal(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(::bind(journal.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_TRUE(SendToJournal(camera, path.c_str()));
    EXPECT_TRUE(SendToJournal(account, path.c_str()));
    for (const char* expected :
         {"MESSAGE=camera 5: no signal\nPRIORITY=3\nSYSLOG_IDENTIFIER=lookhaven-recorder\nLOOKHAVEN_CAMERA=5\n",
          "MESSAGE==\xc3\xa4\nPRIORITY=6\nSYSLOG_IDENTIFIER=lookhaven-request\n"
          "LOOKHAVEN_ACCOUNT=J\xc3\xb6rg @ home\n"}) {
        std::array<char, 512> datagram{};
        const ssize_t size = ::recv(journal.Get(), datagram.data(), datagram.size(), MSG_DONTWAIT);
        EXPECT_EQ(std::string(datagram.data(), static_cast<std::size_t>(std::max<ssize_t>(size, 0))), expected);
    }
    while (SendToJournal(camera, path.c_str())) {  // until its queue is full: a log must not wait for it
    }
}

TEST(MomentTest, IsoTimesSayTheirZoneOrAreTheHosts) {
    ::setenv("TZ", "UTC-2", 1);  // two hours ahead
    ::tzset();
    constexpr std::int64_t kMorning = 1'772'352'900;  // 2026-03-01T08:15:00Z
    const struct {
        std::string text;
        std::int64_t utc_s;  // -1: refused
        bool has_zone = true;
    } rows[] = {
        {"2026-03-01T08:15:00Z", kMorning},
        {"2026-03-01 08:15Z", kMorning},
        {"2026-03-01T08:15:30.999Z", kMorning + 30},
        {"2026-03-01T09:15:00+01:00", kMorning},
        {"2026-03-01T04:45-0330", kMorning},
        {"2026-03-01T10:15:00,5", kMorning, false},
        {"2026-03-01 10:15", kMorning, false},
        {"2026-03-01", kMorning - 10 * 3600 - 900, false},
        {"2026-03-01Z", kMorning - 8 * 3600 - 900},
        {"2026-02-30T08:15:00Z", -1},
        {"2026-03-01T08:15:00 01:00", -1},
        {"2026-03-01T08:15:00+1:00", -1},
        {"2026-03-01T08:15:00+01:0", -1},
        {"2026-03-01T08:15:00+01:00Z", -1},
        {"2026-03-01T08:15.5Z", -1},
        {"2026-03-01T08:15:30.Z", -1},
        {"2026-03-01T08:15:30.2.5Z", -1},
        {"2026-03-01T08:15:00+14:01", kMorning - 14 * 3600 - 60},
        {"2026-03-01T08:15:00+99:00", -1},
        {"2026-03-01T08:15:00-00:60", -1},
        {"2026-03-01T08:15:60Z", -1},
        {" 2026-03-01T08:15:00Z", -1},
        {std::string("2026-03-01T08:15:30\0junk Z", 26), -1},
        {"08:15", -1},
        {"+01:00", -1},
        {"Z", -1},
        {"", -1},
    };
    for (const auto& row : rows) {
        const std::optional<Moment> moment = ParseMoment(row.text);
        EXPECT_EQ(moment ? moment->utc_s : -1, row.utc_s) << row.text;
        EXPECT_TRUE(!moment || moment->has_zone == row.has_zone) << row.text;
    }
    ::unsetenv("TZ");
    ::tzset();
}

TEST(ClockTest, ABootHasOneIdWhoeverTellsIt) {
    const std::string boot = BootId();
    EXPECT_EQ(boot.size(), 32U) << boot;
    EXPECT_EQ(TimeSinceBoot().boot, boot);
    ::setenv("LOOKHAVEN_BOOT_ID", boot.c_str(), 1);
    EXPECT_EQ(BootId(), boot) << "as systemd gives it, without the hyphens of /proc";
    ::setenv("LOOKHAVEN_BOOT_ID", std::string(32, '0').c_str(), 1);
    EXPECT_EQ(TimeSinceBoot().boot, std::string(32, '0')) << "whatever /proc says";
    ::unsetenv("LOOKHAVEN_BOOT_ID");
}

TEST(ClockTest, DatesAreUtcWithMilliseconds) {
    EXPECT_EQ(FormatUtc(0), "1970-01-01T00:00:00.000Z");
    EXPECT_EQ(FormatUtc(951'827'696'007), "2000-02-29T12:34:56.007Z");
}

}  // namespace
}  // namespace lookhaven::base
