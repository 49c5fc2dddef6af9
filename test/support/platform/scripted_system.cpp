// SPDX-License-Identifier: Apache-2.0
//
// The system calls that a script decides about; the linker redirects calls here (--wrap). Without a script those that
// gtest makes too are passed on.
#include <cerrno>
#include <cstdio>

#include <unistd.h>

#include "test/support/platform/record.h"

using lookhaven::test::Call;
using lookhaven::test::CurrentPlatform;
using lookhaven::test::Script;

// Machines of 32 bits with times of 64 have another function behind time(); CMakeLists.txt wraps that.
#ifdef __USE_TIME_BITS64
#define REAL_TIME __real___time64
#define WRAP_TIME __wrap___time64
#else
#define REAL_TIME __real_time
#define WRAP_TIME __wrap_time
#endif

namespace {

void RecordMutex(const char* what, const pthread_mutex_t* mutex) {
    if (CurrentPlatform() != nullptr && mutex == Script().watched_mutex) {
        Script().Record(what);
    }
}

}  // namespace

extern "C" {

int __real_sigaction(int, const struct sigaction*, struct sigaction*);
std::time_t REAL_TIME(std::time_t*);
int __real_fflush(std::FILE*);
int __real_feof(std::FILE*);
int __real_ferror(std::FILE*);
void* __real_malloc(std::size_t);
int __real_pthread_mutex_lock(pthread_mutex_t*);
int __real_pthread_mutex_unlock(pthread_mutex_t*);
int __real_pthread_mutex_destroy(pthread_mutex_t*);

int __wrap_sigaction(int signal, const struct sigaction* action, struct sigaction* old) {
    if (CurrentPlatform() == nullptr) {
        return __real_sigaction(signal, action, old);
    }
    Call("sigaction", signal, action->sa_flags, sigisemptyset(&action->sa_mask) ? "no mask" : "mask");
    return Script().failing_signals.count(signal) != 0 ? -1 : __real_sigaction(signal, action, old);
}
unsigned int __wrap_sleep(unsigned int seconds) {
    Script().now += static_cast<std::time_t>(seconds);
    Script().monotonic_now += static_cast<long>(seconds);
    return Call("sleep", seconds), 0;
}
int __wrap_usleep(useconds_t microseconds) {
    return Call("usleep", microseconds), 0;
}
std::time_t WRAP_TIME(std::time_t* result) {
    return CurrentPlatform() == nullptr ? REAL_TIME(result) : Script().now;
}
int __wrap_fflush(std::FILE* stream) {
    if (CurrentPlatform() == nullptr || stream != stdout) {
        return __real_fflush(stream);
    }
    Call("fflush");
    if (Script().flush_fails) {
        errno = EPIPE;
        return EOF;
    }
    return __real_fflush(stream);
}
int __wrap_feof(std::FILE* stream) {
    return CurrentPlatform() == nullptr || stream != stdout ? __real_feof(stream) : Script().is_eof;
}
int __wrap_ferror(std::FILE* stream) {
    return CurrentPlatform() == nullptr || stream != stdout ? __real_ferror(stream) : Script().is_error;
}
int __wrap_shmdt(const void* segment) {
    return Call(segment == lookhaven::test::AudioRing() ? "audio shmdt" : "shmdt"), 0;
}
void* __wrap_malloc(std::size_t size) {
    constexpr std::size_t kPicture = 2097152;
    const bool has_memory = size != kPicture || CurrentPlatform() == nullptr || Script().has_memory;
    return has_memory ? __real_malloc(size) : nullptr;
}
int __wrap_pthread_mutex_lock(pthread_mutex_t* mutex) {
    RecordMutex("lock", mutex);
    const int result = __real_pthread_mutex_lock(mutex);
    const bool is_scripted = CurrentPlatform() != nullptr && mutex == &Script().common_cfg.m_Mutex;
    return is_scripted && Script().lock_result != 0 ? Script().lock_result : result;
}
int __wrap_pthread_mutex_unlock(pthread_mutex_t* mutex) {
    RecordMutex("unlock", mutex);
    return __real_pthread_mutex_unlock(mutex);
}
int __wrap_pthread_mutex_destroy(pthread_mutex_t* mutex) {
    RecordMutex("destroy", mutex);
    return __real_pthread_mutex_destroy(mutex);
}

}  // extern "C"
