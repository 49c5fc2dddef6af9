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

bool SleepWhile(const std::atomic<std::uint32_t>& word, std::uint32_t seen, std::chrono::microseconds timeout) {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(timeout);
    const timespec relative{static_cast<time_t>(seconds.count()),
                            static_cast<long>(std::chrono::nanoseconds(timeout - seconds).count())};
    return syscall(SYS_futex, &word, FUTEX_WAIT, seen, &relative, nullptr, 0) == 0 || errno != EINTR;
}

bool SleepWhileBoth(const SeenWord& first, const SeenWord& second, std::chrono::microseconds timeout) {
    const auto waiter = [](const SeenWord& word) {
        return futex_waitv{word.seen, reinterpret_cast<std::uintptr_t>(&word.word), FUTEX_32, 0};
    };
    const std::array<futex_waitv, 2> waiters{waiter(first), waiter(second)};
    const std::int64_t until_micros = MonotonicMicros() + timeout.count();
    // Of 64 bits on every machine, unlike timespec.
    const __kernel_timespec until{until_micros / 1'000'000, until_micros % 1'000'000 * 1000};
    return syscall(SYS_futex_waitv, waiters.data(), waiters.size(), 0, &until, CLOCK_MONOTONIC) >= 0 ||
           errno == EAGAIN || errno == ETIMEDOUT;
}

void Wake(std::atomic<std::uint32_t>& word) {
    word.fetch_add(1);
    syscall(SYS_futex, &word, FUTEX_WAKE, INT_MAX, nullptr, nullptr, 0);
}

}  // namespace lookhaven::base
