// SPDX-License-Identifier: Apache-2.0
//
// Takes system calls away from a process: all but those that are named, or those that are named.
//
// Why so        A refused call fails with ENOSYS, as on an old kernel, so that the C library takes another way where it
//               knows one. libseccomp knows the calls' numbers on each architecture, and leaves out what one lacks.
#pragma once

#include <initializer_list>
#include <memory>
#include <vector>

#include <linux/filter.h>
#include <seccomp.h>

namespace lookhaven::base {

// The lower 32 bits of an argument, masked, have that value; or, negated, the whole argument has another one.
struct ArgumentCondition {
    unsigned argument;
    int value;
    int mask = ~0;
    bool negated = false;
};
constexpr ArgumentCondition ArgumentIsNot(unsigned argument, int value) {
    return {argument, value, ~0, true};
}

// Stands for the id of the process that installs the filter, even if another one made it. No process has this id.
// Compare without a mask; any other use of this value in a filter is replaced, too.
constexpr int kOwnProcess = 0x7fffff1d;

class SystemCallFilter {
  public:
    enum class DefaultAction { kRefuse, kAllow };

    // Without exceptions, all calls are refused, or allowed. These throw std::system_error or std::bad_alloc.
    explicit SystemCallFilter(DefaultAction action);
    // The calls, which SCMP_SYS names, are an exception from that; with conditions, when all of them hold. A call may
    // be named several times.
    void AddException(std::initializer_list<int> calls, std::initializer_list<ArgumentCondition> conditions = {});

    // For InstallSystemCallFilter, in any number of processes.
    std::vector<sock_filter> Program() const;

  private:
    std::unique_ptr<void, decltype(&::seccomp_release)> filter_;
    const unsigned exception_;
};

// Filters the calls of this thread and of what it starts, for good; takes about 50 µs. False when this kernel, or what
// emulates it, has no filters. Throws std::system_error.
[[nodiscard]] bool InstallSystemCallFilter(std::vector<sock_filter> program);

}  // namespace lookhaven::base
