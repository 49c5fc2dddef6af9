// SPDX-License-Identifier: Apache-2.0
//
// Waits for a word in shared memory to change.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>

namespace lookhaven::base {

// Sleeps while the word is still seen, until it is woken or the time is over. False when a signal ended the sleep.
bool SleepWhile(const std::atomic<std::uint32_t>& word, std::uint32_t seen, std::chrono::microseconds timeout);

// Changes the word and wakes everybody who sleeps on it.
void Wake(std::atomic<std::uint32_t>& word);

}  // namespace lookhaven::base
