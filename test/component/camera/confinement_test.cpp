// SPDX-License-Identifier: Apache-2.0
//
// What the process of a camera tries once somebody has taken it over.
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <functional>

#include <dirent.h>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/mman.h>
#include <sys/ptrace.h>
#include <sys/shm.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <unistd.h>

#include "standalone/camera/confinement.h"
#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::test {
namespace {

bool Works(const std::function<bool()>& attempt, bool confined) {
    const int status = WaitFor(InChild([&] {
        if (confined) {
            camera::ConfineThisProcess();
        }
        ::_exit(attempt() ? 0 : 1);
    }));
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) <= 1) << "status " << status;
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

bool OpensSocket(int family) {
    return ::socket(family, SOCK_STREAM, 0) >= 0;
}

bool SetsOption(int level, int option) {
    const int one = 1;
    return ::setsockopt(::socket(AF_INET, SOCK_DGRAM, 0), level, option, &one, sizeof one) == 0;
}

bool Listens() {
    return ::listen(::socket(AF_INET, SOCK_STREAM, 0), 1) == 0;
}

bool Connects() {
    sockaddr_in nobody{};
    nobody.sin_family = AF_INET;
    nobody.sin_port = htons(1);
    nobody.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    const int socket = ::socket(AF_INET, SOCK_STREAM, 0);
    return ::connect(socket, reinterpret_cast<const sockaddr*>(&nobody), sizeof nobody) == 0 || errno == ECONNREFUSED;
}

bool ResolvesName() {
    addrinfo* found = nullptr;
    return ::getaddrinfo("localhost", "80", nullptr, &found) == 0;
}

bool AttachesSharedMemory() {
    const int id = ::shmget(IPC_PRIVATE, 4096, IPC_CREAT | 0600);
    return id >= 0 && ::shmctl(id, IPC_RMID, nullptr) == 0;
}

bool StartsProcess() {
    const pid_t child = ::fork();
    if (child == 0) {
        ::_exit(0);
    }
    return child > 0;
}

bool ReadsMemoryOfProcess() {
    char from = 'x';
    char to = 0;
    const iovec local{&to, 1};
    const iovec remote{&from, 1};
    return ::process_vm_readv(::getpid(), &local, 1, &remote, 1, 0) == 1;
}

bool MakesCode() {
    return ::mmap(nullptr, 4096, PROT_READ | PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0) != MAP_FAILED;
}

TEST(Confinement, LeavesNothingButTheWayToTheCamera) {
    const TemporaryFolder home;
    const std::string store = home / "lookhaven.db";
    const std::string key = home / "key.pem";
    std::ofstream(store) << "rows";
    std::ofstream(key) << "secret";
    const struct {
        const char* name;
        std::function<bool()> attempt;
        bool works_confined = false;
    } rows[] = {
        {"reads the store", [&] { return ::open(store.c_str(), O_RDONLY) >= 0; }},
        {"writes the store", [&] { return ::open(store.c_str(), O_WRONLY) >= 0; }},
        {"reads a TLS key", [&] { return ::open(key.c_str(), O_RDONLY) >= 0; }},
        {"lists a folder", [&] { return ::opendir(home.Path().c_str()) != nullptr; }},
        {"makes a file", [&] { return ::open((home / "new").c_str(), O_CREAT | O_WRONLY, 0600) >= 0; }},
        {"removes a file", [&] { return ::unlink((home / "new").c_str()) == 0; }},
        {"attaches shared memory", AttachesSharedMemory},
        {"runs a program", [] { return ::execl("/bin/true", "true", nullptr) == 0; }},
        {"starts a process", StartsProcess},
        {"signals its parent", [] { return ::kill(::getppid(), 0) == 0; }},
        {"sends signals through a descriptor",
         [] { return ::fcntl(::socket(AF_INET, SOCK_DGRAM, 0), F_SETOWN, ::getppid()) == 0; }},
        {"is traced", [] { return ::ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) == 0; }},
        {"reads a process's memory", ReadsMemoryOfProcess},
        {"makes code", MakesCode},
        {"opens a local socket", [] { return OpensSocket(AF_UNIX); }},
        {"opens a socket of a rare protocol", [] { return ::socket(AF_INET, SOCK_DGRAM, IPPROTO_UDPLITE) >= 0; }},
        {"listens", Listens},
        {"sends to everybody", [] { return SetsOption(SOL_SOCKET, SO_BROADCAST); }},
        {"asks for errors of the network", [] { return SetsOption(SOL_IP, IP_RECVERR); }, true},
        {"connects", Connects, true},
        {"resolves a name", ResolvesName, true},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        EXPECT_EQ(Works(row.attempt, true), row.works_confined);
        EXPECT_TRUE(Works(row.attempt, false)) << "this attempt proves nothing";
    }
}

}  // namespace
}  // namespace lookhaven::test
