// SPDX-License-Identifier: Apache-2.0
//
// Preloaded into programs, shifts their wall clock while they run: the file that LOOKHAVEN_SHIFTED_CLOCK names holds
// how many seconds it is ahead.
//
// Why so        A real step of the clock would hit everything else on the machine. The file is mapped, since a process
//               in a sandbox may open none.
#include <cstdint>
#include <cstdlib>
#include <ctime>

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/time.h>
#include <unistd.h>

namespace {

const volatile std::int64_t* MapShift() {
    static const std::int64_t kNone = 0;
    const char* path = std::getenv("LOOKHAVEN_SHIFTED_CLOCK");
    const int file = path == nullptr ? -1 : ::open(path, O_RDONLY | O_CLOEXEC);
    void* data = file < 0 ? MAP_FAILED : ::mmap(nullptr, sizeof kNone, PROT_READ, MAP_SHARED, file, 0);
    if (file >= 0) {
        ::close(file);
    }
    return data == MAP_FAILED ? &kNone : static_cast<const volatile std::int64_t*>(data);
}

std::int64_t ShiftSeconds() {
    static const volatile std::int64_t* const shift = MapShift();
    return *shift;
}

}  // namespace

#pragma GCC visibility push(default)
extern "C" {

int clock_gettime(clockid_t clock, timespec* now) noexcept {
    static const auto real = reinterpret_cast<decltype(&clock_gettime)>(::dlsym(RTLD_NEXT, "clock_gettime"));
    const int result = real(clock, now);
    if (result == 0 && (clock == CLOCK_REALTIME || clock == CLOCK_REALTIME_COARSE)) {
        now->tv_sec += ShiftSeconds();
    }
    return result;
}

int gettimeofday(timeval* now, void*) noexcept {
    timespec precise{};
    const int result = clock_gettime(CLOCK_REALTIME, &precise);
    *now = {precise.tv_sec, precise.tv_nsec / 1000};
    return result;
}

time_t time(time_t* now) noexcept {
    timespec precise{};
    clock_gettime(CLOCK_REALTIME, &precise);
    if (now != nullptr) {
        *now = precise.tv_sec;
    }
    return precise.tv_sec;
}

}  // extern "C"
#pragma GCC visibility pop
