// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/shared_mutex.h"

#include <cerrno>
#include <chrono>
#include <system_error>
#include <thread>

namespace lookhaven::control {

void InitSharedMutex(pthread_mutex_t& mutex) {
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_setpshared(&attributes, PTHREAD_PROCESS_SHARED);
    pthread_mutexattr_setrobust(&attributes, PTHREAD_MUTEX_ROBUST);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_ERRORCHECK);
    const int error = pthread_mutex_init(&mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
    if (error != 0) {
        throw std::system_error(error, std::generic_category(), "cannot make a mutex that processes share");
    }
}

SharedLock TryLock(pthread_mutex_t& mutex) {
    int error = pthread_mutex_trylock(&mutex);
    for (int tries = 1; error == EBUSY && tries < 1000; ++tries) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
        error = pthread_mutex_trylock(&mutex);
    }
    const bool is_held = error == 0 || (error == EOWNERDEAD && pthread_mutex_consistent(&mutex) == 0);
    return SharedLock(is_held ? &mutex : nullptr);
}

}  // namespace lookhaven::control
