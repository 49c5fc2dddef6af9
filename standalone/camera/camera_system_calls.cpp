// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/camera_system_calls.h"

#include <utility>

#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/socket.h>

#include "standalone/base/sanitizers.h"
#include "standalone/base/system_call_filter.h"

namespace lookhaven::camera {

namespace {

using base::SystemCallFilter;

void AllowHarmless(SystemCallFilter& filter) {
    filter.AddException(
        {// Sockets and descriptors.
         SCMP_SYS(close), SCMP_SYS(connect), SCMP_SYS(getpeername), SCMP_SYS(getsockname), SCMP_SYS(getsockopt),
         SCMP_SYS(poll), SCMP_SYS(ppoll), SCMP_SYS(ppoll_time64), SCMP_SYS(pselect6), SCMP_SYS(pselect6_time64),
         SCMP_SYS(read), SCMP_SYS(readv), SCMP_SYS(recv), SCMP_SYS(recvfrom), SCMP_SYS(recvmmsg),
         SCMP_SYS(recvmmsg_time64), SCMP_SYS(recvmsg), SCMP_SYS(select), SCMP_SYS(_newselect), SCMP_SYS(send),
         SCMP_SYS(sendmmsg), SCMP_SYS(sendmsg), SCMP_SYS(sendto), SCMP_SYS(shutdown), SCMP_SYS(write), SCMP_SYS(writev),
         // Files, of which Landlock chooses.
         SCMP_SYS(fstat), SCMP_SYS(fstat64), SCMP_SYS(fstatat64), SCMP_SYS(getdents64), SCMP_SYS(lseek),
         SCMP_SYS(_llseek), SCMP_SYS(newfstatat), SCMP_SYS(pread64), SCMP_SYS(statx),
         // Memory.
         SCMP_SYS(brk), SCMP_SYS(madvise), SCMP_SYS(mremap), SCMP_SYS(munmap),
         // Time, and the thread itself.
         SCMP_SYS(clock_getres), SCMP_SYS(clock_getres_time64), SCMP_SYS(clock_gettime), SCMP_SYS(clock_gettime64),
         SCMP_SYS(clock_nanosleep), SCMP_SYS(clock_nanosleep_time64), SCMP_SYS(exit), SCMP_SYS(exit_group),
         SCMP_SYS(futex), SCMP_SYS(futex_time64), SCMP_SYS(getegid), SCMP_SYS(getegid32), SCMP_SYS(geteuid),
         SCMP_SYS(geteuid32), SCMP_SYS(getgid), SCMP_SYS(getgid32), SCMP_SYS(getpid), SCMP_SYS(getrandom),
         SCMP_SYS(getrusage), SCMP_SYS(gettid), SCMP_SYS(gettimeofday), SCMP_SYS(getuid), SCMP_SYS(getuid32),
         SCMP_SYS(nanosleep), SCMP_SYS(restart_syscall), SCMP_SYS(rt_sigaction), SCMP_SYS(rt_sigprocmask),
         SCMP_SYS(rt_sigreturn), SCMP_SYS(sched_getaffinity), SCMP_SYS(sched_yield), SCMP_SYS(sigaltstack),
         SCMP_SYS(sigreturn), SCMP_SYS(sysinfo), SCMP_SYS(time), SCMP_SYS(uname)});
    if (base::kSanitized) {  // for its checks and reports
        filter.AddException({SCMP_SYS(pipe), SCMP_SYS(pipe2), SCMP_SYS(prctl), SCMP_SYS(prlimit64), SCMP_SYS(readlink),
                             SCMP_SYS(readlinkat)});
    }
}

// Another protocol would load a module of the kernel.
void AllowSockets(SystemCallFilter& filter) {
    constexpr int kSocketType = 0xF;
    for (const int family : {AF_INET, AF_INET6}) {
        for (const auto& [type, protocol] : {std::pair<int, int>(SOCK_STREAM, 0),
                                             {SOCK_STREAM, IPPROTO_TCP},
                                             {SOCK_DGRAM, 0},
                                             {SOCK_DGRAM, IPPROTO_UDP}}) {
            filter.AddException({SCMP_SYS(socket)}, {{0, family}, {1, type, kSocketType}, {2, protocol}});
        }
    }
    // What the C library sets where it asks a name server, and libav where it connects.
    for (const auto& [level, option] :
         {std::pair<int, int>(IPPROTO_IP, IP_RECVERR), {IPPROTO_IPV6, IPV6_RECVERR}, {IPPROTO_TCP, TCP_NODELAY}}) {
        filter.AddException({SCMP_SYS(setsockopt)}, {{1, level}, {2, option}});
    }
}

}  // namespace

bool FilterSystemCalls() {
    SystemCallFilter filter(SystemCallFilter::DefaultAction::kRefuse);
    AllowHarmless(filter);
    AllowSockets(filter);
    filter.AddException({SCMP_SYS(openat)}, {{2, O_RDONLY, O_ACCMODE | O_CREAT | O_TRUNC}});
    filter.AddException({SCMP_SYS(mmap), SCMP_SYS(mmap2), SCMP_SYS(mprotect)}, {{2, 0, PROT_EXEC}});
    for (const int command : {F_GETFD, F_SETFD, F_GETFL, F_SETFL}) {  // not F_SETOWN, which sends signals
        filter.AddException({SCMP_SYS(fcntl), SCMP_SYS(fcntl64)}, {{1, command}});
    }
    for (const int command : {FIONREAD, FIONBIO}) {
        filter.AddException({SCMP_SYS(ioctl)}, {{1, command}});
    }
    filter.AddException({SCMP_SYS(tgkill)}, {{0, base::kOwnProcess}});  // abort
    return base::InstallSystemCallFilter(filter.Program());
}

}  // namespace lookhaven::camera
