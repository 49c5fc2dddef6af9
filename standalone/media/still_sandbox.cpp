// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/still_sandbox.h"

#include <sys/mman.h>

#include "standalone/base/log.h"
#include "standalone/base/sanitizers.h"
#include "standalone/base/system_call_filter.h"

namespace lookhaven::media {

using base::SystemCallFilter;

namespace {

std::vector<sock_filter> StillPictureFilter() {
    SystemCallFilter filter(SystemCallFilter::DefaultAction::kRefuse);
    // Where the result goes and the log, which are open.
    filter.AddException({SCMP_SYS(read), SCMP_SYS(write), SCMP_SYS(writev), SCMP_SYS(recv), SCMP_SYS(recvfrom),
                         SCMP_SYS(sendmsg), SCMP_SYS(poll), SCMP_SYS(ppoll), SCMP_SYS(ppoll_time64), SCMP_SYS(fstat),
                         SCMP_SYS(fstat64), SCMP_SYS(newfstatat), SCMP_SYS(fstatat64), SCMP_SYS(statx), SCMP_SYS(lseek),
                         SCMP_SYS(_llseek), SCMP_SYS(shutdown), SCMP_SYS(close)});
    filter.AddException({SCMP_SYS(brk), SCMP_SYS(madvise), SCMP_SYS(mremap), SCMP_SYS(munmap)});
    filter.AddException({SCMP_SYS(mmap), SCMP_SYS(mmap2), SCMP_SYS(mprotect)}, {{2, 0, PROT_EXEC}});
    filter.AddException({SCMP_SYS(clock_gettime), SCMP_SYS(clock_gettime64), SCMP_SYS(exit), SCMP_SYS(exit_group),
                         SCMP_SYS(futex), SCMP_SYS(futex_time64), SCMP_SYS(getpid), SCMP_SYS(getrandom),
                         SCMP_SYS(gettid), SCMP_SYS(gettimeofday), SCMP_SYS(restart_syscall), SCMP_SYS(rt_sigaction),
                         SCMP_SYS(rt_sigprocmask), SCMP_SYS(rt_sigreturn), SCMP_SYS(sched_getaffinity),
                         SCMP_SYS(sched_yield), SCMP_SYS(sigreturn)});
    if (base::kSanitized) {  // for its checks and reports
        filter.AddException({SCMP_SYS(pipe), SCMP_SYS(pipe2), SCMP_SYS(readlink), SCMP_SYS(sigaltstack)});
    }
    filter.AddException({SCMP_SYS(tgkill)}, {{0, base::kOwnProcess}});  // where its client is gone
    return filter.Program();
}

}  // namespace

void InstallDecoderFilter(const std::vector<sock_filter>& filter) {
    if (!base::InstallSystemCallFilter(filter)) {
        base::LogWarning("pictures are decoded with all system calls: this kernel has no filters for them");
    }
}

void EnterStillSandbox() {
    InstallDecoderFilter(StillPictureFilter());
}

}  // namespace lookhaven::media
