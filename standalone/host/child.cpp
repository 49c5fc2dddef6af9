// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/child.h"

#include <csignal>
#include <exception>
#include <string>

#include <sys/prctl.h>
#include <unistd.h>

#include "standalone/base/log.h"

namespace lookhaven::host {

namespace {

constexpr int kWakeDescriptor = 3;

// Closes every descriptor from the first on. Older kernels, and filters of system calls, refuse close_range.
void CloseFrom(int first) {
    if (::close_range(static_cast<unsigned int>(first), ~0U, 0) == 0) {
        return;
    }
    for (int descriptor = first; descriptor < static_cast<int>(::sysconf(_SC_OPEN_MAX)); ++descriptor) {
        ::close(descriptor);
    }
}

}  // namespace

void LeaveHost(pid_t host, control::SlotTable& slots, int standard_output) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != host) {
        _exit(1);  // the host died before it could take us along
    }
    if (standard_output >= 0) {
        ::dup2(standard_output, STDOUT_FILENO);
    }
    ::dup2(slots.WakeDescriptor(), kWakeDescriptor);
    slots.SetWakeDescriptor(kWakeDescriptor);
    CloseFrom(kWakeDescriptor + 1);
    for (int number = 1; number < NSIG; ++number) {
        std::signal(number, SIG_DFL);
    }
    for (const int number : {SIGPIPE, SIGINT, SIGQUIT, SIGHUP, SIGUSR1, SIGUSR2}) {
        std::signal(number, SIG_IGN);
    }
    sigset_t none;
    sigemptyset(&none);
    ::sigprocmask(SIG_SETMASK, &none, nullptr);
}

void RunAndExit(const std::function<void()>& work) {
    try {
        work();
        _exit(0);
    } catch (const std::exception& error) {
        base::LogError(std::string("a child process failed: ") + error.what());
    } catch (...) {
        base::LogError("a child process failed: an exception of unknown type");
    }
    _exit(1);
}

}  // namespace lookhaven::host
