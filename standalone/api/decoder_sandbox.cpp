// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/decoder_sandbox.h"

#include <cerrno>

#include <fcntl.h>
#include <linux/landlock.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/system_call_filter.h"
#include "standalone/binding/common_record.h"
#include "standalone/media/still_sandbox.h"

namespace lookhaven::api {

using base::ArgumentIsNot;
using base::SystemCallFilter;

namespace {

constexpr std::string_view kSqlite = "sqlite:";

bool IsSqlite(const std::string& store_url) {
    return store_url.starts_with(kSqlite);
}

constexpr std::uint64_t kWriting = LANDLOCK_ACCESS_FS_WRITE_FILE | LANDLOCK_ACCESS_FS_MAKE_REG |
                                   LANDLOCK_ACCESS_FS_MAKE_DIR | LANDLOCK_ACCESS_FS_REMOVE_FILE;

void MayWriteBelow(const base::FileDescriptor& rules, const std::filesystem::path& folder) {
    const base::FileDescriptor opened(::open(folder.c_str(), O_PATH | O_CLOEXEC));
    const landlock_path_beneath_attr beneath{.allowed_access = kWriting, .parent_fd = opened.Get()};
    if (::syscall(SYS_landlock_add_rule, rules.Get(), LANDLOCK_RULE_PATH_BENEATH, &beneath, 0) != 0) {
        base::ThrowErrno("cannot let a player write below " + folder.string());
    }
}

// Whatever its rules for files, a process under Landlock can access neither memory nor descriptors of processes
// outside, not even as root. Without Landlock in the kernel, Yama restricts that. The rules let it write what a player
// must: the store, its progress and its player file; not /proc, where it could have another process killed first.
void ShieldOtherProcesses(const base::Installation& installation) {
    landlock_ruleset_attr attributes{};
    attributes.handled_access_fs = LANDLOCK_ACCESS_FS_EXECUTE | kWriting | LANDLOCK_ACCESS_FS_MAKE_SYM |
                                   LANDLOCK_ACCESS_FS_MAKE_SOCK | LANDLOCK_ACCESS_FS_MAKE_FIFO |
                                   LANDLOCK_ACCESS_FS_REMOVE_DIR;
    const base::FileDescriptor rules(
        static_cast<int>(::syscall(SYS_landlock_create_ruleset, &attributes, sizeof attributes, 0)));
    if (!rules && (errno == ENOSYS || errno == EOPNOTSUPP)) {
        return;
    }
    if (rules) {
        MayWriteBelow(rules, installation.Home());
        MayWriteBelow(rules, installation.RunFolder());
        if (const std::string store = installation.StoreUrl(); IsSqlite(store)) {
            std::error_code error;
            const std::filesystem::path file = store.substr(kSqlite.size());
            MayWriteBelow(rules, std::filesystem::weakly_canonical(file, error).parent_path());
        }
        MayWriteBelow(rules, "/tmp");
        MayWriteBelow(rules, "/dev");
    }
    if (!rules || ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
        ::syscall(SYS_landlock_restrict_self, rules.Get(), 0) != 0) {
        base::ThrowErrno("cannot confine this process with Landlock");
    }
}

}  // namespace

// Calls that only root may make are not listed: each costs an instruction, which takes time when a player starts.
std::vector<sock_filter> PlaybackFilter(const std::string& store_url) {
    SystemCallFilter filter(SystemCallFilter::DefaultAction::kAllow);
    // Programs and processes. Threads are made by clone, since a filter cannot read what clone3 is told.
    filter.AddException({SCMP_SYS(execve), SCMP_SYS(execveat), SCMP_SYS(fork), SCMP_SYS(vfork), SCMP_SYS(clone3)});
    filter.AddException({SCMP_SYS(clone)}, {{0, 0, CLONE_THREAD}});
    filter.AddException({SCMP_SYS(ptrace), SCMP_SYS(process_vm_readv), SCMP_SYS(process_vm_writev),
                         SCMP_SYS(pidfd_open), SCMP_SYS(pidfd_getfd), SCMP_SYS(pidfd_send_signal), SCMP_SYS(kill),
                         SCMP_SYS(tkill), SCMP_SYS(rt_sigqueueinfo), SCMP_SYS(rt_tgsigqueueinfo)});
    filter.AddException({SCMP_SYS(tgkill)}, {ArgumentIsNot(0, base::kOwnProcess)});  // when its client is gone
    filter.AddException({SCMP_SYS(prlimit64)}, {ArgumentIsNot(0, 0)});
    filter.AddException({SCMP_SYS(setpriority), SCMP_SYS(ioprio_set), SCMP_SYS(sched_setaffinity),
                         SCMP_SYS(sched_setattr), SCMP_SYS(sched_setparam), SCMP_SYS(sched_setscheduler)});
    // Signals for what happens on a descriptor, and input for the terminal that the host may have been started from.
    for (const int command : {F_SETOWN, F_SETSIG, F_SETOWN_EX}) {
        filter.AddException({SCMP_SYS(fcntl), SCMP_SYS(fcntl64)}, {{1, command}});
    }
    for (const int command : {FIOSETOWN, SIOCSPGRP, TIOCSTI, TIOCLINUX}) {
        filter.AddException({SCMP_SYS(ioctl)}, {{1, command}});
    }
    // Not covered by Landlock in many kernels: truncating files, and changing their owner or mode.
    filter.AddException({SCMP_SYS(truncate), SCMP_SYS(truncate64), SCMP_SYS(creat), SCMP_SYS(openat2), SCMP_SYS(chmod),
                         SCMP_SYS(fchmodat), SCMP_SYS(chown), SCMP_SYS(chown32), SCMP_SYS(lchown), SCMP_SYS(lchown32),
                         SCMP_SYS(fchownat), SCMP_SYS(setxattr), SCMP_SYS(lsetxattr)});
    filter.AddException({SCMP_SYS(open)}, {{1, O_TRUNC, O_TRUNC}});
    filter.AddException({SCMP_SYS(openat)}, {{2, O_TRUNC, O_TRUNC}});
    // The rings of live views.
    filter.AddException({SCMP_SYS(shmget), SCMP_SYS(shmat), SCMP_SYS(shmctl)});
    // Parts of the kernel in which faults are found, and which nothing here uses.
    filter.AddException({SCMP_SYS(unshare), SCMP_SYS(setns), SCMP_SYS(bpf), SCMP_SYS(perf_event_open),
                         SCMP_SYS(userfaultfd), SCMP_SYS(io_uring_setup), SCMP_SYS(io_uring_enter),
                         SCMP_SYS(io_uring_register), SCMP_SYS(keyctl), SCMP_SYS(add_key), SCMP_SYS(request_key),
                         SCMP_SYS(personality), SCMP_SYS(modify_ldt), SCMP_SYS(vmsplice)});
    // No listening, and no connections but to a database server: AF_UNIX, AF_INET, AF_INET6; TCP, or UDP to a name
    // server.
    filter.AddException({SCMP_SYS(bind), SCMP_SYS(listen), SCMP_SYS(accept), SCMP_SYS(accept4)});
    for (const int family : {0, 3, 4, 5, 6, 7, 8, 9, 11, 12, 13, 14, 15}) {
        filter.AddException({SCMP_SYS(socket)}, {{0, family}});
    }
    for (const int bit : {16, 32}) {  // the higher ones
        filter.AddException({SCMP_SYS(socket)}, {{0, bit, bit}});
    }
    for (int protocol = 1; protocol < 32; ++protocol) {
        if (protocol != IPPROTO_TCP && protocol != IPPROTO_UDP) {
            filter.AddException({SCMP_SYS(socket)}, {{2, protocol}});
        }
    }
    for (const int bit : {32, 64, 128, 256, 512, 1024}) {
        filter.AddException({SCMP_SYS(socket)}, {{2, bit, bit}});
    }
    filter.AddException({SCMP_SYS(socketpair)}, {ArgumentIsNot(0, AF_UNIX)});
    if (IsSqlite(store_url)) {
        for (const int family : {AF_INET, AF_INET6}) {
            filter.AddException({SCMP_SYS(socket)}, {{0, family}});
        }
    }
    return filter.Program();
}

void EnterPlaybackSandbox(const base::Installation& installation, const std::vector<sock_filter>& playback_filter) {
    ShieldOtherProcesses(installation);
    media::InstallDecoderFilter(playback_filter);
}

void EnterStillPictureSandbox(control::SlotTable& slots, const control::Slot& own) {
    slots.KeepOnly(own);
    binding::ReleaseCommonRecord();
    media::EnterStillSandbox();
}

}  // namespace lookhaven::api
