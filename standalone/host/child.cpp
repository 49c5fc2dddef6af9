// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/child.h"

#include <csignal>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

#include <sys/prctl.h>
#include <unistd.h>

#include "standalone/base/log.h"
#include "standalone/base/process.h"

namespace lookhaven::host {

namespace {

constexpr int kWakeDescriptor = 3;

// Closes every descriptor from the first on. Older kernels, and filters of system calls, refuse close_range; there may
// be a thousand million numbers to try then, so it looks which are open.
void CloseFrom(int first) {
    if (::close_range(static_cast<unsigned int>(first), ~0U, 0) == 0) {
        return;
    }
    std::vector<int> open;
    std::error_code error;
    for (auto at = std::filesystem::directory_iterator("/proc/self/fd", error);
         at != std::filesystem::directory_iterator(); at.increment(error)) {
        open.push_back(std::atoi(at->path().filename().c_str()));
    }
    for (const int descriptor : open) {
        if (descriptor >= first) {
            ::close(descriptor);
        }
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
    base::PreferAsOomVictim();
    ::dup2(slots.WakeDescriptor(), kWakeDescriptor);
    slots.SetWakeDescriptor(kWakeDescriptor);
    CloseFrom(kWakeDescriptor + 1);
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
