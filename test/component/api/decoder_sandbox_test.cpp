// SPDX-License-Identifier: Apache-2.0
//
// What a decoder tries, in a request process, once a camera's picture has taken it over.
#include "standalone/api/decoder_sandbox.h"

#include <functional>
#include <thread>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/ptrace.h>
#include <sys/socket.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::test {
namespace {

bool Works(const std::function<bool()>& attempt, const std::vector<sock_filter>& filter) {
    const int status = WaitFor(InChild([&] {
        if (!filter.empty()) {
            api::EnterDecoderSandbox(filter);
        }
        ::_exit(attempt() ? 0 : 1);
    }));
    EXPECT_TRUE(WIFEXITED(status)) << "status " << status;
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

int connection[2];

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
    const std::vector<sock_filter> player = api::PlaybackFilter();
    const std::vector<sock_filter> still = api::StillPictureFilter();
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
        {"opens a socket of a rare family", [] { return ::socket(AF_NETLINK, SOCK_RAW, 0) >= 0; }, false},
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
        EXPECT_EQ(Works(row.attempt, player), row.works_in_player);
        EXPECT_EQ(Works(row.attempt, still), row.works_in_still);
        EXPECT_TRUE(Works(row.attempt, {})) << "this attempt proves nothing";
    }
}

}  // namespace
}  // namespace lookhaven::test
