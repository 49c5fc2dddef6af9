// SPDX-License-Identifier: Apache-2.0
//
// Child processes of a test.
#pragma once

#include <csignal>
#include <utility>

#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace lookhaven::test {

// Runs the body in a child, which ends with status 0 after it, or 99 when it throws, and dies with the test.
template <typename Body>
pid_t InChild(Body body) {
    const pid_t child = ::fork();
    if (child == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        try {
            body();
        } catch (...) {
            ::_exit(99);
        }
        ::_exit(0);
    }
    return child;
}

// Its wait status.
inline int WaitFor(pid_t child) {
    int status = 0;
    ::waitpid(child, &status, 0);
    return status;
}

inline void KillAndWait(pid_t child) {
    ::kill(child, SIGKILL);
    WaitFor(child);
}

// A child that stays where it is after the body, until the object goes: then it is killed. The constructor returns when
// the body has run.
class KilledChild {
  public:
    template <typename Body>
    explicit KilledChild(Body body) {
        int ready[2];
        EXPECT_EQ(::pipe(ready), 0);
        pid_ = InChild([&] {
            body();
            [[maybe_unused]] const ssize_t written = ::write(ready[1], "x", 1);
            for (;;) {
                ::pause();
            }
        });
        ::close(ready[1]);
        char byte = 0;
        EXPECT_EQ(::read(ready[0], &byte, 1), 1) << "the child failed";
        ::close(ready[0]);
    }
    ~KilledChild() { Kill(); }
    KilledChild(const KilledChild&) = delete;
    KilledChild& operator=(const KilledChild&) = delete;

    void Kill() {
        if (pid_ > 0) {
            KillAndWait(std::exchange(pid_, -1));
        }
    }
    pid_t Pid() const { return pid_; }

  private:
    pid_t pid_ = -1;
};

}  // namespace lookhaven::test
