// SPDX-License-Identifier: Apache-2.0
//
// A mutex in memory that processes share. One whose owner died is taken over: what it guards must be good after any of
// its owner's writes.
#pragma once

#include <memory>

#include <pthread.h>

namespace lookhaven::control {

// Makes the mutex: process-shared, robust, error-checking. Throws std::system_error.
void InitSharedMutex(pthread_mutex_t& mutex);

struct Unlock {
    void operator()(pthread_mutex_t* mutex) const { pthread_mutex_unlock(mutex); }
};
using SharedLock = std::unique_ptr<pthread_mutex_t, Unlock>;

// Null after a second: others hold it for microseconds, so one that is still held then belongs to a stopped process.
SharedLock TryLock(pthread_mutex_t& mutex);

}  // namespace lookhaven::control
