// SPDX-License-Identifier: Apache-2.0
//
// A plain mutex whose destructor waits for the thread that still holds it.
#pragma once

#include <pthread.h>

// Not recursive, default attributes. lock and unlock are spelled for std::lock_guard.
class LHMutex {
  public:
    LHMutex();
    // Locks, unlocks, destroys: whoever holds the mutex now finishes first. No one may start waiting for it any more.
    ~LHMutex();
    LHMutex(const LHMutex&) = delete;
    LHMutex& operator=(const LHMutex&) = delete;

    void lock();
    void unlock();

  private:
    pthread_mutex_t m_Mutex;
};
