// SPDX-License-Identifier: Apache-2.0
//
// A disk that loses what was written. Defines fdatasync: include it in one source of a program.
#pragma once

#include <cerrno>

#include <sys/syscall.h>
#include <unistd.h>

namespace lookhaven::test {

// How many of this thread's next calls report that writing failed. Like Linux, which reports a lost write once: the
// call after them succeeds, whatever became of the data.
inline thread_local int g_failing_syncs = 0;

}  // namespace lookhaven::test

// Stands in front of the C library's.
extern "C" int fdatasync(int descriptor) {
    if (lookhaven::test::g_failing_syncs > 0) {
        --lookhaven::test::g_failing_syncs;
        errno = EIO;
        return -1;
    }
    return static_cast<int>(::syscall(SYS_fdatasync, descriptor));
}
