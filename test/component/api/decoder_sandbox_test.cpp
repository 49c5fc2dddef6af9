// SPDX-License-Identifier: Apache-2.0
//
// What a decoder tries, in a request process, once a camera's picture has taken it over.
#include "standalone/api/decoder_sandbox.h"

#include <csignal>
#include <fstream>
#include <functional>
#include <string>
#include <thread>

#include <fcntl.h>
#include <linux/landlock.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/shm.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::test {
namespace {

bool Works(const std::function<bool()>& attempt, const std::function<void()>& enter) {
    const int status = WaitFor(InChild([&] {
        enter();
        ::_exit(attempt() ? 0 : 1);
    }));
    EXPECT_TRUE(WIFEXITED(status)) << "status " << status;
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

int connection[2];
rlimit limit{};

bool StartsThread() {
    bool ran = false;
    std::thread([&ran] { ran = true; }).join();
    return ran;
}

// As an answer is sent.
bool Sends() {
    char byte = 'x';
    iovec piece{&byte, 1};
    msghdr message{};
    message.msg_iov = &piece;
    message.msg_iovlen = 1;
    return ::sendmsg(connection[0], &message, MSG_DONTWAIT | MSG_NOSIGNAL) == 1;
}

TEST(DecoderSandbox, LeavesADecoderWhatItsProcessNeeds) {
    const TemporaryFolder home;
    ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, connection), 0);
    const auto peer = [of = "/proc/" + std::to_string(::getpid()) + '/'](const char* file) { return of + file; };
    control::SlotTable slots(40);
    const control::Slot& other = *slots.Take();
    const control::Slot& own = *slots.Take();
    const int wake = slots.WakeDescriptor();
    const base::Installation installation((base::Installation::CreateFolders(home), home.Path()));
    std::ofstream(home / "recording") << "footage";
    const auto filter = api::PlaybackFilter("postgresql:");
    const auto play = [&] {
        api::EnterPlaybackSandbox(installation, filter);
        slots.KeepOnly(own);
    };
    ::prctl(PR_SET_PTRACER, PR_SET_PTRACER_ANY);  // else Yama might be what refuses
    const bool lacks_landlock =
        ::syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION) <= 0;
    const auto decode_still = [&] { api::EnterStillPictureSandbox(slots, own); };
    const struct {
        const char* name;
        std::function<bool()> attempt;
        bool works_in_player;
        bool works_in_still = false;
    } rows[] = {
        {"runs a program", [] { return ::execl("/bin/true", "true", nullptr) == 0; }, false},
        {"starts a process", [] { return ::fork() >= 0; }, false},
        {"is traced", [] { return ::ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) == 0; }, false},
        {"signals its parent", [] { return ::kill(::getppid(), 0) == 0; }, false},
        {"signals a thread of its parent", [] { return ::tgkill(::getppid(), ::getppid(), 0) == 0; }, false},
        {"signals itself", [] { return ::raise(0) == 0; }, true, true},
        {"limits its parent", [] { return ::prlimit(::getppid(), RLIMIT_CPU, nullptr, &limit) == 0; }, false},
        {"reads its own limits", [] { return ::getrlimit(RLIMIT_AS, &limit) == 0; }, true},
        {"slows its parent down", [] { return ::setpriority(PRIO_PROCESS, static_cast<id_t>(::getppid()), 0) == 0; },
         false},
        {"has its parent signalled", [] { return ::fcntl(connection[0], F_SETOWN, ::getppid()) == 0; }, false},
        {"the same otherwise", [owner = ::getpid()] { return ::ioctl(connection[0], FIOSETOWN, &owner) == 0; }, false},
        {"chooses the signal", [] { return ::fcntl(connection[0], F_SETSIG, SIGUSR1) == 0; }, false},
        {"sets flags", [] { return ::fcntl(connection[0], F_SETFL, O_NONBLOCK) == 0; }, true},
        {"opens its parent's memory", [&] { return ::open(peer("mem").c_str(), O_RDWR) >= 0; }, lacks_landlock},
        {"opens its parent's files", [&] { return ::open(peer("fd/2").c_str(), O_RDONLY) >= 0; }, lacks_landlock},
        {"makes a ring", [] { return ::shmctl(::shmget(IPC_PRIVATE, 1, 0600), IPC_RMID, nullptr) == 0; }, false},
        {"reads another request", [&] { return ::write(connection[0], &other.serial, 1) == 1; }, false},
        {"reads its own", [&] { return ::write(connection[0], &own.serial, 1) == 1; }, true, true},
        {"wakes the host", [wake, one = std::uint64_t{1}] { return ::write(wake, &one, sizeof one) > 0; }, false},
        {"opens a socket of a rare family", [] { return ::socket(AF_NETLINK, SOCK_RAW, 0) >= 0; }, false},
        {"opens one of a rare protocol", [] { return ::socket(AF_INET, SOCK_STREAM, 262) >= 0; }, false},
        {"empties a recording", [&] { return ::truncate((home / "recording").c_str(), 0) == 0; }, false},
        {"empties one on opening", [&] { return ::open((home / "recording").c_str(), O_RDONLY | O_TRUNC) >= 0; },
         false},
        {"has itself spared", [&] { return ::open("/proc/self/oom_score_adj", O_WRONLY) >= 0; }, lacks_landlock},
        {"listens", [] { return ::listen(::socket(AF_INET, SOCK_STREAM, 0), 1) == 0; }, false},
        {"reaches a database", [] { return ::socket(AF_UNIX, SOCK_STREAM, 0) >= 0; }, true},
        {"opens a recording", [] { return ::open("/proc/self/maps", O_RDONLY) >= 0; }, true},
        {"writes its pid", [&] { return ::open((home / "pid").c_str(), O_CREAT | O_RDWR, 0600) >= 0; }, true},
        {"decodes in threads", StartsThread, true},
        {"makes code", [] { return ::mmap(nullptr, 9, PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0) != MAP_FAILED; },
         true},
        {"takes memory", [] { return std::vector<char>(std::size_t{64} << 20).back() == 0; }, true, true},
        {"answers", Sends, true, true},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        EXPECT_EQ(Works(row.attempt, play), row.works_in_player);
        EXPECT_EQ(Works(row.attempt, decode_still), row.works_in_still);
        EXPECT_TRUE(Works(row.attempt, [] {})) << "this attempt proves nothing";
    }
}

}  // namespace
}  // namespace lookhaven::test
