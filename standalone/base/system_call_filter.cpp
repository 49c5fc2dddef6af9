// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/system_call_filter.h"

#include <cerrno>
#include <cstdint>
#include <system_error>

#include <fcntl.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/io.h"

namespace lookhaven::base {

namespace {

constexpr std::uint32_t kRefusal = SCMP_ACT_ERRNO(ENOSYS);

void Check(int result) {
    if (result < 0) {
        throw std::system_error(-result, std::generic_category(), "cannot filter system calls");
    }
}

}  // namespace

SystemCallFilter::SystemCallFilter(DefaultAction action)
    : filter_(::seccomp_init(action == DefaultAction::kAllow ? SCMP_ACT_ALLOW : kRefusal), &::seccomp_release),
      exception_(action == DefaultAction::kAllow ? kRefusal : SCMP_ACT_ALLOW) {
    if (!filter_) {
        throw std::bad_alloc();
    }
    // Where it is not known, as in an emulator, it is the thread that ends.
    if (const int result = ::seccomp_attr_set(filter_.get(), SCMP_FLTATR_ACT_BADARCH, SCMP_ACT_KILL_PROCESS);
        result != -EINVAL) {
        Check(result);
    }
}

void SystemCallFilter::AddException(std::initializer_list<int> calls,
                                    std::initializer_list<ArgumentCondition> conditions) {
    std::vector<scmp_arg_cmp> compared;
    for (const auto& [argument, value, mask, negated] : conditions) {
        const auto wanted = static_cast<std::uint32_t>(value);
        compared.push_back(negated
                               ? scmp_arg_cmp{argument, SCMP_CMP_NE, wanted, 0}
                               : scmp_arg_cmp{argument, SCMP_CMP_MASKED_EQ, static_cast<std::uint32_t>(mask), wanted});
    }
    for (const int call : calls) {
        Check(::seccomp_rule_add_array(filter_.get(), exception_, call, static_cast<unsigned>(compared.size()),
                                       compared.data()));
    }
}

std::vector<sock_filter> SystemCallFilter::Program() const {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        ThrowErrno("cannot filter system calls");
    }
    const FileDescriptor out(ends[0]);
    FileDescriptor in(ends[1]);
    Check(::seccomp_export_bpf(filter_.get(), in.Get()));  // a pipe holds all of it
    in.Reset();
    std::vector<sock_filter> program(BPF_MAXINSNS);
    const std::size_t bytes = ReadAll(out.Get(), program.data(), program.size() * sizeof(sock_filter)).value_or(0);
    program.resize(bytes / sizeof(sock_filter));
    return program;
}

bool InstallSystemCallFilter(std::vector<sock_filter> program) {
    // A kernel that has filters looks for one at address 0.
    if (::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, nullptr, 0, 0) != 0 && errno != EFAULT) {
        return false;
    }
    for (sock_filter& instruction : program) {
        if (instruction.code == (BPF_JMP | BPF_JEQ | BPF_K) && instruction.k == kOwnProcess) {
            instruction.k = static_cast<std::uint32_t>(::getpid());
        }
    }
    const sock_fprog code{static_cast<unsigned short>(program.size()), program.data()};
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
        ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &code, 0, 0) != 0) {
        ThrowErrno("cannot filter system calls");
    }
    return true;
}

}  // namespace lookhaven::base
