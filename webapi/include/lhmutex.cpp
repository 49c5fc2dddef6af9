// SPDX-License-Identifier: Apache-2.0
//
// A plain mutex whose destructor waits for the thread that holds it.
#include "webapi/include/lhmutex.h"

LHMutex::LHMutex() {
    pthread_mutex_init(&m_Mutex, nullptr);
}

LHMutex::~LHMutex() {
    lock();
    unlock();
    pthread_mutex_destroy(&m_Mutex);
}

void LHMutex::lock() {
    pthread_mutex_lock(&m_Mutex);
}

void LHMutex::unlock() {
    pthread_mutex_unlock(&m_Mutex);
}
