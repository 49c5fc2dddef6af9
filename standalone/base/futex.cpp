// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/futex.h"

#include <array>
#include <cerrno>
#include <climits>
#include <ctime>

#include <linux/futex.h>
#include <linux/time_types.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "standalone/base/clock.h"

namespace lookhaven::base {

namespace {

// The call whose timeout, a __kernel_timespec, is of 64 bits; SYS_futex has one of the machine's.
#ifdef SYS_futex_time64
constexpr long kFutex = SYS_futex_time64;
#else
constexpr long kFutex = SYS_futex;
static_assert(sizeof(long) == 8);
#endif

__kernel_timespec TimespecOf(std::chrono::microseconds time) {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(time);
    return {seconds.count(), std::chrono::nanoseconds(time - seconds).count()};
}

}  // namespace

bool SleepWhile(const std::atomic<std::uint32_t>& word, std::uint32_t seen, std::chrono::microseconds timeout) {
    const __kernel_timespec relative = TimespecOf(timeout);
    return syscall(kFutex, &word, FUTEX_WAIT, seen, &relative, nullptr, 0) == 0 || errno != EINTR;
}

bool SleepWhileBoth(const SeenWord& first, const SeenWord& second, std::chrono::microseconds timeout) {
    const auto waiter = [](const SeenWord& word) {
        return futex_waitv{word.seen, reinterpret_cast<std::uintptr_t>(&word.word), FUTEX_32, 0};
    };
    const std::array<futex_waitv, 2> waiters{waiter(first), waiter(second)};
    const __kernel_timespec until = TimespecOf(std::chrono::microseconds(MonotonicMicros()) + timeout);
    return syscall(SYS_futex_waitv, waiters.data(), waiters.size(), 0, &until, CLOCK_MONOTONIC) >= 0 ||
           errno == EAGAIN || errno == ETIMEDOUT;
}

void Wake(std::atomic<std::uint32_t>& word) {
    word.fetch_add(1);
    syscall(kFutex, &word, FUTEX_WAKE, INT_MAX, nullptr, nullptr, 0);
}

}  // namespace lookhaven::base
