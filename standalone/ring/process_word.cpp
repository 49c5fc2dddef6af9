// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/process_word.h"

#include <atomic>

#include <pthread.h>

namespace lookhaven::ring {

namespace {

std::atomic<std::uint64_t> own_word{0};

void ForgetOwnWord() {
    own_word.store(0, std::memory_order_relaxed);
}

}  // namespace

std::uint64_t OwnWord() {
    std::uint64_t word = own_word.load(std::memory_order_relaxed);
    if (word == 0) {
        [[maybe_unused]] static const int registered = pthread_atfork(nullptr, nullptr, ForgetOwnWord);
        word = ProcessWord(base::ThisProcess());
        own_word.store(word, std::memory_order_relaxed);
    }
    return word;
}

}  // namespace lookhaven::ring
