// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/system_call_filter.h"

#include <bit>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "standalone/camera/sanitizers.h"

namespace lookhaven::camera {

namespace {

static_assert(std::endian::native == std::endian::little, "the low half of an argument comes first");

#if defined(__x86_64__)
constexpr std::uint32_t kArchitecture = AUDIT_ARCH_X86_64;
#elif defined(__aarch64__)
constexpr std::uint32_t kArchitecture = AUDIT_ARCH_AARCH64;
#elif defined(__arm__)
constexpr std::uint32_t kArchitecture = AUDIT_ARCH_ARM;
#else
#error "name this architecture's AUDIT_ARCH"
#endif

constexpr std::uint32_t kAllowed[] = {
    // Sockets and descriptors.
    SYS_close,
    SYS_connect,
    SYS_getpeername,
    SYS_getsockname,
    SYS_getsockopt,
    SYS_ppoll,
    SYS_pselect6,
    SYS_read,
    SYS_readv,
    SYS_recvfrom,
    SYS_recvmmsg,
    SYS_recvmsg,
    SYS_sendmmsg,
    SYS_sendmsg,
    SYS_sendto,
    SYS_setsockopt,
    SYS_shutdown,
    SYS_write,
    SYS_writev,
    // Files, of which Landlock chooses.
    SYS_fstat,
    SYS_getdents64,
    SYS_lseek,
    SYS_pread64,
    SYS_statx,
    // Memory.
    SYS_brk,
    SYS_madvise,
    SYS_mremap,
    SYS_munmap,
    // Time, and the thread itself.
    SYS_clock_getres,
    SYS_clock_gettime,
    SYS_clock_nanosleep,
    SYS_exit,
    SYS_exit_group,
    SYS_futex,
    SYS_getegid,
    SYS_geteuid,
    SYS_getgid,
    SYS_getpid,
    SYS_getrandom,
    SYS_getrusage,
    SYS_gettid,
    SYS_gettimeofday,
    SYS_getuid,
    SYS_nanosleep,
    SYS_restart_syscall,
    SYS_rt_sigaction,
    SYS_rt_sigprocmask,
    SYS_rt_sigreturn,
    SYS_sched_getaffinity,
    SYS_sched_yield,
    SYS_sigaltstack,
    SYS_sysinfo,
    SYS_uname,
// What not every architecture has.
#ifdef SYS_newfstatat
    SYS_newfstatat,
#endif
#ifdef SYS_poll
    SYS_poll,
#endif
#ifdef SYS_select
    SYS_select,
#endif
#ifdef SYS_time
    SYS_time,
#endif
#ifdef __arm__
    SYS__llseek,
    SYS__newselect,
    SYS_clock_getres_time64,
    SYS_clock_gettime64,
    SYS_clock_nanosleep_time64,
    SYS_fstat64,
    SYS_fstatat64,
    SYS_futex_time64,
    SYS_ppoll_time64,
    SYS_pselect6_time64,
    SYS_recv,
    SYS_recvmmsg_time64,
    SYS_send,
    SYS_sigreturn,
#endif
};

// For the checks and reports of a sanitizer.
constexpr std::uint32_t kAllowedSanitized[] = {
    SYS_pipe2, SYS_prctl,    SYS_prlimit64, SYS_readlinkat,
#ifdef SYS_pipe
    SYS_pipe,  SYS_readlink,
#endif
};

#ifdef SYS_mmap
constexpr std::uint32_t kMmap = SYS_mmap;
#else
constexpr std::uint32_t kMmap = SYS_mmap2;
#endif
#ifdef SYS_fcntl64
constexpr std::uint32_t kFcntl = SYS_fcntl64;
#else
constexpr std::uint32_t kFcntl = SYS_fcntl;
#endif

// The argument's lower 32 bits, masked, must be one of the values.
struct Condition {
    std::uint32_t argument;
    std::uint32_t mask;
    std::vector<std::uint32_t> values;
};

class Program {
  public:
    Program() {
        Add(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, arch));
        Add(BPF_JMP | BPF_JEQ | BPF_K, kArchitecture, 1, 0);
        Add(BPF_RET | BPF_K, SECCOMP_RET_KILL_PROCESS);
        Add(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr));
    }

    void Allow(std::uint32_t number) {
        Add(BPF_JMP | BPF_JEQ | BPF_K, number, 0, 1);
        Add(BPF_RET | BPF_K, SECCOMP_RET_ALLOW);
    }

    // Allows the call when every condition holds.
    void Allow(std::uint32_t number, const std::vector<Condition>& conditions) {
        const std::size_t jump = code_.size();
        Add(BPF_JMP | BPF_JEQ | BPF_K, number, 0, 0);
        for (const Condition& condition : conditions) {
            Add(BPF_LD | BPF_W | BPF_ABS,
                static_cast<std::uint32_t>(offsetof(seccomp_data, args)) + condition.argument * 8);
            Add(BPF_ALU | BPF_AND | BPF_K, condition.mask);
            for (std::size_t left = condition.values.size(); const std::uint32_t value : condition.values) {
                Add(BPF_JMP | BPF_JEQ | BPF_K, value, static_cast<std::uint8_t>(left--), 0);
            }
            Refuse();
        }
        Add(BPF_RET | BPF_K, SECCOMP_RET_ALLOW);
        code_[jump].jf = static_cast<std::uint8_t>(code_.size() - jump - 1);
    }

    void Refuse() { Add(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | ENOSYS); }

    sock_fprog Get() { return {static_cast<unsigned short>(code_.size()), code_.data()}; }

  private:
    void Add(unsigned code, std::uint32_t operand, std::uint8_t if_true = 0, std::uint8_t if_false = 0) {
        code_.push_back({static_cast<std::uint16_t>(code), if_true, if_false, operand});
    }

    std::vector<sock_filter> code_;
};

Program MakeProgram() {
    constexpr std::uint32_t kAll = ~std::uint32_t{0};
    constexpr std::uint32_t kSocketType = 0xF;
    Program program;
    for (const std::uint32_t number : kAllowed) {
        program.Allow(number);
    }
    for (const std::uint32_t number : kAllowedSanitized) {
        if (kSanitized) {
            program.Allow(number);
        }
    }
    // Another protocol would load a module of the kernel.
    program.Allow(SYS_socket, {{0, kAll, {AF_INET, AF_INET6}},
                               {1, kSocketType, {SOCK_STREAM, SOCK_DGRAM}},
                               {2, kAll, {0, IPPROTO_TCP, IPPROTO_UDP}}});
    program.Allow(SYS_openat, {{2, O_ACCMODE | O_CREAT | O_TRUNC, {O_RDONLY}}});
    program.Allow(kMmap, {{2, PROT_EXEC, {0}}});
    program.Allow(SYS_mprotect, {{2, PROT_EXEC, {0}}});
    // Not F_SETOWN, which sends signals.
    program.Allow(kFcntl, {{1, kAll, {F_GETFD, F_SETFD, F_GETFL, F_SETFL}}});
    program.Allow(SYS_ioctl, {{1, kAll, {FIONREAD, FIONBIO}}});
    program.Allow(SYS_tgkill, {{0, kAll, {static_cast<std::uint32_t>(::getpid())}}});  // abort
    program.Refuse();
    return program;
}

}  // namespace

bool FilterSystemCalls() {
    // A kernel that has filters looks for one at address 0.
    if (::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, nullptr, 0, 0) != 0 && errno != EFAULT) {
        return false;
    }
    Program program = MakeProgram();
    const sock_fprog code = program.Get();
    if (::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &code, 0, 0) != 0) {
        throw std::system_error(errno, std::generic_category(), "cannot filter system calls");
    }
    return true;
}

}  // namespace lookhaven::camera
