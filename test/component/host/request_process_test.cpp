// SPDX-License-Identifier: Apache-2.0
//
// The processes that the web API host starts: when they end, and that nothing of a request stays behind.
#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <fstream>
#include <iterator>
#include <random>
#include <sstream>

#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/wait.h>

#include "standalone/base/clock.h"
#include "standalone/base/process.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/host/child.h"
#include "standalone/host/listener.h"
#include "standalone/store/users.h"
#include "test/component/host/running_host.h"
#include "test/support/host/scgi_bytes.h"
#include "test/support/process.h"

namespace {

bool g_refuses_close_range = false;

}  // namespace

// In the place of the C library's: an old kernel.
extern "C" int close_range(unsigned int first, unsigned int last, int flags) noexcept {
    static const auto real = reinterpret_cast<decltype(&close_range)>(::dlsym(RTLD_NEXT, "close_range"));
    if (g_refuses_close_range) {
        errno = ENOSYS;
        return -1;
    }
    return real(first, last, flags);
}

namespace lookhaven::host {
namespace {

using namespace std::chrono_literals;

constexpr std::size_t kSpares = 4;

TEST(Host, EndsProcessesWhoseClientLeft) {
    testing::internal::CaptureStderr();
    HostUnderTest host({"--leave-seconds", "0.5"});
    const std::string admin = host.LogIn().secret;
    for (const char* method : {"Stream", "Hang", "DeafStream"}) {
        base::FileDescriptor connection = host.Open(method, admin);
        ASSERT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 1; })) << method;
        if (std::string(method) != "Hang") {
            ASSERT_TRUE(HasPicture(connection)) << method;
        }
        connection.Reset();
        EXPECT_TRUE(Eventually(2s, [&] { return host.RequestProcesses() == 0; })) << method;
    }
    host.End(SIGTERM);
    const std::string log = testing::internal::GetCapturedStderr();
    EXPECT_THAT(log, testing::ContainsRegex("error: request process [0-9]+ died of signal 9\n$"))
        << "it ignores SIGTERM";
    EXPECT_EQ(log.find("error: "), log.rfind("error: ")) << "a client that leaves is none";
    EXPECT_EQ(log.find("warning: "), log.npos);
}

TEST(Host, LogsRequestsWhileThatIsWanted) {
    testing::internal::CaptureStderr();
    HostUnderTest host;
    const std::string guest = host.LogIn("guest").secret;
    const std::string success = "api=Test&version=1&method=Success&password=hidden";
    const auto set_level = [&](int level) {
        control::DebugLogEditor(host.Home()).SetCategory(control::kRequestsCategory, level);
    };
    host.Ask(success, guest);
    ASSERT_TRUE(Eventually(20s, [&] { return host.RequestProcesses() == 0; })) << "logged by then";
    set_level(control::kDebugLevel);
    host.Ask(success, guest);
    host.Ask("api=Test&version=1&method=Crash", guest);
    host.Ask("api=%0aNone&version=1&method=Success", "");
    host.Ask("api=Test&version=1&method=Throw", guest);
    ASSERT_TRUE(Eventually(20s, [&] { return host.RequestProcesses() == 0; }));
    set_level(control::kDebugLevel - 1);
    host.Ask(success, guest);
    host.End(SIGTERM);
    std::istringstream log(testing::internal::GetCapturedStderr());
    std::vector<std::string> lines;
    for (std::string line; std::getline(log, line);) {
        EXPECT_EQ(line.find("hidden"), line.npos);
        EXPECT_EQ(line.find("the request failed: ") == line.npos, line.find(" request[") == line.npos)
            << "the program takes the name that the platform's library has set: " << line;
        if (const std::size_t at = line.find("info: request: "); at != line.npos) {
            lines.push_back(line.substr(at));
        }
    }
    const std::string from = " from 192.0.2.7: ";
    EXPECT_THAT(lines, testing::UnorderedElementsAre(
                           testing::MatchesRegex(".*Test/Success" + from + "200 after [0-9]+ ms, account guest"),
                           testing::MatchesRegex(".*Test/Crash" + from + "died after [0-9]+ ms, account guest"),
                           testing::MatchesRegex(".*: -" + from + "404 after [0-9]+ ms, account -"),
                           testing::MatchesRegex(".*Test/Throw" + from + "500 after [0-9]+ ms, account guest")));
}

TEST_F(RunningHost, RepeatsSigtermUntilAHandlerListens) {
    ASSERT_TRUE(HasPicture(host_.Open("LateStream", admin_)));
    EXPECT_TRUE(Eventually(8s, [&] { return host_.RequestProcesses() == 0; })) << "well before it is killed";
}

TEST_F(RunningHost, EndsStreamsOfEndedSessions) {
    store::Store records = store::Store::Open(host_.Home().StoreUrl());
    const base::FileDescriptor other = OpenStream(host_, admin_);
    const struct {
        const char* name;
        std::function<void(const store::NewSession&)> end;
    } cases[] = {
        {"log-out",
         [&](const store::NewSession& session) {
             EXPECT_EQ(host_.Ask("api=VEXO.Auth&version=1&method=Logout", session.secret, {}, "a=1").status, 200);
         }},
        {"ended in the store", [&](const store::NewSession& session) { store::Sessions(records).End(session.handle); }},
        {"new password", [&](const store::NewSession&) { store::Users(records).SetPassword(2, "a new password"); }},
        {"denial", [&](const store::NewSession&) { store::Users(records).Deny(2, 1); }}};
    for (const auto& each : cases) {
        const store::NewSession session = host_.LogIn("guest");
        const base::FileDescriptor stream = OpenStream(host_, session.secret);
        each.end(session);
        EXPECT_TRUE(Eventually(2s, [&] { return IsOver(stream); })) << each.name;
        EXPECT_EQ(host_.Ask("api=Test&version=1&method=Success", session.secret).status, 401) << each.name;
    }
    EXPECT_FALSE(IsOver(other)) << "another's stream goes on";
}

TEST_F(RunningHost, LeavesNothingAfterCutConnections) {
    const std::string request = ScgiBytes({{"REQUEST_METHOD", "GET"},
                                           {"QUERY_STRING", "api=Test&version=1&method=Stream"},
                                           {"HTTP_COOKIE", "id=" + admin_}});
    ASSERT_EQ(host_.Ask("api=Test&version=1&method=Success", admin_).status, 200);
    const auto is_at_rest = [&] { return host_.RequestProcesses() == 0 && host_.SpareProcesses().size() == kSpares; };
    ASSERT_TRUE(Eventually(2s, is_at_rest));
    std::size_t descriptors = host_.Descriptors();
    Eventually(200ms, [&] {  // until the host has closed those of the process that has ended
        descriptors = std::min(descriptors, host_.Descriptors());
        return false;
    });
    std::mt19937 random(7);
    for (int i = 0; i < 200; ++i) {
        const base::FileDescriptor connection = host_.Connect();
        const std::size_t length = random() % 2 == 0 ? request.size() : random() % request.size();
        send(connection.Get(), request.data(), length, MSG_NOSIGNAL);
        std::array<char, 64> block{};
        if (length == request.size() && random() % 2 == 0) {
            recv(connection.Get(), block.data(), block.size(), 0);
        }
    }
    EXPECT_TRUE(Eventually(5s, is_at_rest));
    EXPECT_TRUE(Eventually(2s, [&] { return host_.Descriptors() == descriptors; }))
        << host_.Descriptors() << " instead of " << descriptors;
}

TEST(Host, TakesItsProcessesAlong) {
    for (const int signal : {SIGKILL, SIGTERM}) {
        HostUnderTest host;
        const base::FileDescriptor stream = OpenStream(host, host.LogIn().secret);
        std::vector<pid_t> children = host.Children();
        ASSERT_EQ(children.size(), 2U) << "the stream and the watcher";
        ASSERT_TRUE(Eventually(2s, [&] { return host.SpareProcesses().size() == kSpares; }));
        std::ranges::copy(host.SpareProcesses(), std::back_inserter(children));
        const std::filesystem::path socket = host.Home().WebApiSocket();
        const int status = host.End(signal);
        EXPECT_TRUE(Eventually(2s, [&] { return IsOver(stream); }));
        for (const pid_t child : children) {
            EXPECT_TRUE(Eventually(2s, [&] { return base::ProcessStartTicks(child) == 0; }));
        }
        if (signal == SIGTERM) {
            EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << status;
            EXPECT_FALSE(std::filesystem::exists(socket));
        }
    }
}

TEST(Host, SweepsThePlayerFilesOfThoseWhoDiedWithAnEarlierHost) {
    const pid_t dead = test::InChild([] {});
    test::WaitFor(dead);
    const std::string file = "/tmp/player_src.pid." + std::to_string(::getpid());
    std::ofstream(file + "dead") << dead;
    std::ofstream(file + "a11ce") << ::getpid();
    const HostUnderTest host;
    EXPECT_EQ(host.Ask("api=VEXO.Auth&version=1&method=Status", "").status, 401);
    EXPECT_FALSE(std::filesystem::exists(file + "dead"));
    EXPECT_TRUE(std::filesystem::remove(file + "a11ce")) << "of a living process";
}

TEST_F(RunningHost, GivesRequestsToProcessesThatWait) {
    const auto is_full = [&] { return host_.SpareProcesses().size() == kSpares; };
    ASSERT_TRUE(Eventually(5s, is_full));
    // One that is not ready yet is left alone.
    EXPECT_TRUE(Eventually(5s, [&] {
        const std::vector<pid_t> spares = host_.SpareProcesses();
        const base::FileDescriptor stream = OpenStream(host_, admin_);
        return std::ranges::any_of(host_.Children(),
                                   [&](pid_t child) { return std::ranges::count(spares, child) == 1; });
    }));
    ASSERT_TRUE(Eventually(5s, is_full)) << "others take their places";
    const std::vector<pid_t> killed = host_.SpareProcesses();
    for (const pid_t spare : killed) {
        kill(spare, SIGKILL);
    }
    // A request that was given to one before is lost with it.
    ASSERT_TRUE(Eventually(5s, [&] { return host_.SpareProcesses().empty(); }));
    EXPECT_EQ(host_.Ask("api=Test&version=1&method=Success", admin_).status, 200);
    EXPECT_TRUE(Eventually(10s, is_full));
    for (const pid_t spare : host_.SpareProcesses()) {
        EXPECT_EQ(std::ranges::count(killed, spare), 0);
    }
}

TEST_F(RunningHost, AProcessThatWaitedServesTheStoreThatThereIsNow) {
    ASSERT_TRUE(Eventually(5s, [&] { return host_.SpareProcesses().size() == kSpares; }));
    ASSERT_EQ(host_.Ask("api=Test&version=1&method=Success", admin_).status, 200);
    const std::string moved = "sqlite:" + (host_.Home().Home() / "moved.db").string();
    store::Store::Migrate(moved);
    store::Store records = store::Store::Open(moved);
    const int user = store::Users(records).Add("moved", "right password", store::Privilege::kOwner).id;
    const store::NewSession session = store::Sessions(records).Create(user, base::WallSeconds());
    host_.Home().SetStoreUrl(moved);
    EXPECT_EQ(host_.Ask("api=Test&version=1&method=Success", session.secret).status, 200);
    EXPECT_EQ(host_.Ask("api=Test&version=1&method=Success", admin_).status, 401);
}

TEST(LeaveHost, ClosesWhatTheHostHasOpenOnOldKernelsToo) {
    control::SlotTable slots(1);
    const base::FileDescriptor connection(::open("/dev/null", O_RDONLY));
    const base::FileDescriptor high(::fcntl(connection.Get(), F_DUPFD, 700));
    ASSERT_GE(high.Get(), 700);
    for (const bool refuses : {false, true}) {
        g_refuses_close_range = refuses;
        const int left = WEXITSTATUS(test::WaitFor(test::InChild([&, host = ::getpid()] {
            LeaveHost(host, slots, connection.Get());
            int open = 0;
            for (int descriptor = 0; descriptor < 1024; ++descriptor) {
                open += ::fcntl(descriptor, F_GETFD) >= 0 ? 1 : 0;
            }
            ::_exit(open);
        })));
        EXPECT_EQ(left, 4) << "0, 1, 2 and the table's";
        g_refuses_close_range = false;
    }
}

TEST(Host, LeavesItsSuccessorsSocketAlone) {
    const test::TemporaryFolder folder;
    const std::filesystem::path path = folder / "socket";
    Listener old(path);
    for (int i = 0; i < 50; ++i) {  // a file system may give the next file the number of one that is gone
        old.Close();
        EXPECT_FALSE(std::filesystem::exists(path));
        const Listener successor(path);
        old.Close();
        EXPECT_TRUE(std::filesystem::exists(path)) << i;
    }
}

TEST_F(RunningHost, StartsItsWatcherAnew) {
    ASSERT_TRUE(Eventually(2s, [&] { return host_.Children().size() == 1; }));
    const pid_t watcher = host_.Children().front();
    kill(watcher, SIGKILL);
    EXPECT_TRUE(Eventually(5s, [&] { return host_.Children().size() == 1 && host_.Children().front() != watcher; }));
}

TEST(Host, ServesASocketHandedOver) {
    HostUnderTest host({}, true);
    EXPECT_EQ(host.Ask("api=Test&version=1&method=Success", host.LogIn().secret).status, 200);
    const std::filesystem::path socket = host.Home().WebApiSocket();
    host.End(SIGTERM);
    EXPECT_TRUE(std::filesystem::exists(socket)) << "its creator removes it";
}

}  // namespace
}  // namespace lookhaven::host
