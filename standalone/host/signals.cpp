// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/signals.h"

#include <csignal>

#include <sys/signalfd.h>

namespace lookhaven::host {

namespace {

// The parent process may have this one ignore signals.
void StopIgnoringSignals() {
    for (int number = 1; number < NSIG; ++number) {
        struct sigaction inherited {};
        if (::sigaction(number, nullptr, &inherited) == 0 && inherited.sa_handler == SIG_IGN) {
            std::signal(number, SIG_DFL);
        }
    }
}

}  // namespace

base::FileDescriptor BlockSignals() {
    StopIgnoringSignals();
    sigset_t all;
    sigfillset(&all);
    ::sigprocmask(SIG_SETMASK, &all, nullptr);
    sigset_t ending;
    sigemptyset(&ending);
    sigaddset(&ending, SIGTERM);
    sigaddset(&ending, SIGINT);
    return base::FileDescriptor(::signalfd(-1, &ending, SFD_CLOEXEC | SFD_NONBLOCK));
}

}  // namespace lookhaven::host
