// SPDX-License-Identifier: Apache-2.0
//
// A plain mutex whose destructor waits for the thread that holds it.
#pragma once

#include <pthread.h>

// Not recursive, default attributes. lock and unlock have the names that std::lock_guard calls.
class LHMutex {
  public:
    LHMutex();
    // Locks, unlocks, destroys: a thread that holds the mutex finishes first. No other thread may start to wait for it.
    ~LHMutex();
    LHMutex(const LHMutex&) = delete;
    LHMutex& operator=(const LHMutex&) = delete;

    void lock();
    void unlock();

  private:
    pthread_mutex_t m_Mutex;
};
