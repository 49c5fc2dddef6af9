// SPDX-License-Identifier: Apache-2.0
//
// Blocks all signals of the calling thread while other threads are started.
//
// Why so        A new thread inherits its creator's signal mask. Threads that are started meanwhile keep signals
//               blocked, so that the main thread is the one that is interrupted.
#pragma once

#include <csignal>

namespace lookhaven::base {

class BlockedSignals {
  public:
    BlockedSignals() {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &before_);
    }
    BlockedSignals(const BlockedSignals&) = delete;
    BlockedSignals& operator=(const BlockedSignals&) = delete;
    ~BlockedSignals() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }

  private:
    sigset_t before_{};
};

}  // namespace lookhaven::base
