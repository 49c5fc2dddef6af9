// SPDX-License-Identifier: Apache-2.0
//
// Waits for a word in shared memory to change.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>

namespace lookhaven::base {

// Sleeps while the word equals seen, until Wake or the timeout; may return early. False when a signal ended the sleep.
bool SleepWhile(const std::atomic<std::uint32_t>& word, std::uint32_t seen, std::chrono::microseconds timeout);

// A word, and the value that it had when it was looked at.
struct SeenWord {
    const std::atomic<std::uint32_t>& word;
    std::uint32_t seen;
};

// The same while both words equal what was seen. False, too, without a sleep, on kernels that cannot wait for two words
// (before Linux 5.16).
bool SleepWhileBoth(const SeenWord& first, const SeenWord& second, std::chrono::microseconds timeout);

// Increments the word and wakes all threads that sleep on it, in every process.
void Wake(std::atomic<std::uint32_t>& word);

}  // namespace lookhaven::base
