// SPDX-License-Identifier: Apache-2.0
//
// Waits for what another thread or process does.
#pragma once

#include <chrono>
#include <fstream>
#include <functional>
#include <string>
#include <thread>

#include <sys/types.h>

namespace lookhaven::test {

// Polls until the condition holds; false when it does not within the limit.
inline bool Eventually(std::chrono::milliseconds limit, const std::function<bool()>& condition) {
    const auto end = std::chrono::steady_clock::now() + limit;
    while (!condition()) {
        if (std::chrono::steady_clock::now() > end) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    return true;
}

inline bool Eventually(const std::function<bool()>& condition) {
    return Eventually(std::chrono::seconds(10), condition);
}

// The thread of this process (gettid) is blocked in a system call. One that has been woken is not, even before it runs.
inline bool IsAsleep(pid_t thread) {
    std::ifstream file("/proc/self/task/" + std::to_string(thread) + "/stat");
    std::string text;
    std::getline(file, text);
    return text.substr(text.rfind(')') + 1, 2) == " S";
}

}  // namespace lookhaven::test
