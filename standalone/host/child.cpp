// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/child.h"

#include <cerrno>
#include <csignal>
#include <cstring>
#include <exception>
#include <string>
#include <utility>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/log.h"
#include "standalone/base/process.h"

namespace lookhaven::host {

namespace {

constexpr int kWakeDescriptor = 3;
constexpr int kKeptDescriptor = 4;

[[noreturn]] void RunAndExit(const std::function<void()>& work) {
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

}  // namespace

std::optional<Child> StartChild(const char* what, const std::function<void()>& work) {
    const pid_t pid = ::fork();
    if (pid == 0) {
        RunAndExit(work);
    }
    base::FileDescriptor process(pid < 0 ? -1 : static_cast<int>(::syscall(SYS_pidfd_open, pid, 0)));
    if (!process) {
        base::LogError(std::string("cannot start ") + what + ": " + std::strerror(errno));
        if (pid > 0) {
            ::kill(pid, SIGKILL);
            ::waitpid(pid, nullptr, 0);
        }
        return std::nullopt;
    }
    return Child{pid, std::move(process)};
}

int LeaveHost(pid_t host, control::SlotTable& slots, int standard_output, int kept) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != host) {
        _exit(1);  // the host died before it could take us along
    }
    if (standard_output >= 0) {
        ::dup2(standard_output, STDOUT_FILENO);
    }
    base::PreferAsOomVictim();
    // Out of the way of the two numbers.
    const int moved = kept < 0 ? -1 : ::fcntl(kept, F_DUPFD, kKeptDescriptor + 1);
    ::dup2(slots.WakeDescriptor(), kWakeDescriptor);
    slots.SetWakeDescriptor(kWakeDescriptor);
    if (moved >= 0) {
        ::dup2(moved, kKeptDescriptor);
    }
    base::CloseFrom(moved < 0 ? kKeptDescriptor : kKeptDescriptor + 1);
    for (const int number : {SIGPIPE, SIGINT, SIGQUIT, SIGHUP, SIGUSR1, SIGUSR2}) {
        std::signal(number, SIG_IGN);
    }
    sigset_t none;
    sigemptyset(&none);
    ::sigprocmask(SIG_SETMASK, &none, nullptr);
    return moved < 0 ? -1 : kKeptDescriptor;
}

}  // namespace lookhaven::host
