// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/futex.h"

#include <cerrno>
#include <climits>
#include <ctime>

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace lookhaven::base {

bool SleepWhile(const std::atomic<std::uint32_t>& word, std::uint32_t seen, std::chrono::microseconds timeout) {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(timeout);
    const timespec relative{static_cast<time_t>(seconds.count()),
                            static_cast<long>(std::chrono::nanoseconds(timeout - seconds).count())};
    return syscall(SYS_futex, &word, FUTEX_WAIT, seen, &relative, nullptr, 0) == 0 || errno != EINTR;
}

void Wake(std::atomic<std::uint32_t>& word) {
    word.fetch_add(1);
    syscall(SYS_futex, &word, FUTEX_WAKE, INT_MAX, nullptr, nullptr, 0);
}

}  // namespace lookhaven::base
