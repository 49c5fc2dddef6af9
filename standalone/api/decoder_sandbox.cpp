// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/decoder_sandbox.h"

#include <sched.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <unistd.h>

#include "standalone/base/log.h"
#include "standalone/base/system_call_filter.h"

namespace lookhaven::api {

using base::SystemCallFilter;

// Each call costs an instruction, and each instruction time at the start of a player. What only root may do is not named.
std::vector<sock_filter> PlaybackFilter() {
    SystemCallFilter filter(SystemCallFilter::DefaultAction::kAllow);
    // Programs and processes. Threads are made by clone, since a filter cannot read what clone3 is told.
    filter.AddException({SCMP_SYS(execve), SCMP_SYS(execveat), SCMP_SYS(fork), SCMP_SYS(vfork), SCMP_SYS(clone3)});
    filter.AddException({SCMP_SYS(clone)}, {{0, 0, CLONE_THREAD}});
    filter.AddException({SCMP_SYS(ptrace), SCMP_SYS(process_vm_readv), SCMP_SYS(process_vm_writev),
                         SCMP_SYS(pidfd_getfd), SCMP_SYS(pidfd_send_signal), SCMP_SYS(kill), SCMP_SYS(tkill),
                         SCMP_SYS(rt_sigqueueinfo), SCMP_SYS(rt_tgsigqueueinfo)});
    // Parts of the kernel in which faults are found, and which nothing here uses.
    filter.AddException({SCMP_SYS(unshare), SCMP_SYS(setns), SCMP_SYS(bpf), SCMP_SYS(perf_event_open),
                         SCMP_SYS(userfaultfd), SCMP_SYS(io_uring_setup), SCMP_SYS(io_uring_enter),
                         SCMP_SYS(io_uring_register), SCMP_SYS(keyctl), SCMP_SYS(add_key), SCMP_SYS(request_key),
                         SCMP_SYS(personality), SCMP_SYS(modify_ldt), SCMP_SYS(vmsplice)});
    // It serves nobody, and speaks to a database's server alone: AF_UNIX, AF_INET, AF_INET6.
    filter.AddException({SCMP_SYS(bind), SCMP_SYS(listen), SCMP_SYS(accept), SCMP_SYS(accept4)});
    for (const int family : {0, 3, 4, 5, 6, 7, 8, 9, 11, 12, 13, 14, 15}) {
        filter.AddException({SCMP_SYS(socket)}, {{0, family}});
    }
    for (const int bit : {16, 32}) {  // the higher ones
        filter.AddException({SCMP_SYS(socket)}, {{0, bit, bit}});
    }
    return filter.Program();
}

std::vector<sock_filter> StillPictureFilter() {
    SystemCallFilter filter(SystemCallFilter::DefaultAction::kRefuse);
    // The connection and the log, which are open.
    filter.AddException({SCMP_SYS(read), SCMP_SYS(write), SCMP_SYS(writev), SCMP_SYS(recv), SCMP_SYS(recvfrom),
                         SCMP_SYS(sendmsg), SCMP_SYS(poll), SCMP_SYS(ppoll), SCMP_SYS(ppoll_time64), SCMP_SYS(fstat),
                         SCMP_SYS(fstat64), SCMP_SYS(newfstatat), SCMP_SYS(fstatat64), SCMP_SYS(statx), SCMP_SYS(lseek),
                         SCMP_SYS(shutdown), SCMP_SYS(close)});
    filter.AddException({SCMP_SYS(brk), SCMP_SYS(madvise), SCMP_SYS(mremap), SCMP_SYS(munmap)});
    filter.AddException({SCMP_SYS(mmap), SCMP_SYS(mmap2), SCMP_SYS(mprotect)}, {{2, 0, PROT_EXEC}});
    filter.AddException({SCMP_SYS(clock_gettime), SCMP_SYS(clock_gettime64), SCMP_SYS(exit), SCMP_SYS(exit_group),
                         SCMP_SYS(futex), SCMP_SYS(futex_time64), SCMP_SYS(getpid), SCMP_SYS(getrandom),
                         SCMP_SYS(gettid), SCMP_SYS(gettimeofday), SCMP_SYS(restart_syscall), SCMP_SYS(rt_sigaction),
                         SCMP_SYS(rt_sigprocmask), SCMP_SYS(rt_sigreturn), SCMP_SYS(sched_getaffinity),
                         SCMP_SYS(sched_yield), SCMP_SYS(sigreturn)});
    // AddressSanitizer asks for it before each function that never returns.
    filter.AddException({SCMP_SYS(sigaltstack)});
    filter.AddException({SCMP_SYS(tgkill)}, {{0, ::getpid()}});  // where its client is gone
    return filter.Program();
}

void EnterDecoderSandbox(const std::vector<sock_filter>& filter) {
    if (!base::InstallSystemCallFilter(filter)) {
        base::LogWarning("a camera's pictures are decoded with all system calls: this kernel has no filters for them");
    }
}

}  // namespace lookhaven::api
