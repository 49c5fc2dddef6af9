// SPDX-License-Identifier: Apache-2.0
//
// Blocks all signals while threads are started.
//
// Why so        A new thread inherits the mask of its parent. Threads that are started under this block stay without
//               signals, so that the main thread is the one interrupted.
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
