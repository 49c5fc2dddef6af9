// SPDX-License-Identifier: Apache-2.0
//
// What the parts of a request process cost on this machine: prints the time of a page's first use, of the copy of a
// page that a forked process writes to, and of a fork. A virtual machine may need fifty times what its host does.
#include <cstddef>
#include <cstdint>
#include <iostream>

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/clock.h"

namespace {

using lookhaven::base::MonotonicMicros;

constexpr std::size_t kPages = 5000;  // 20 MB, as much as the host has
constexpr std::size_t kPageBytes = 4096;
constexpr int kForks = 50;

double MicrosAPage(char* pages) {
    const std::int64_t begin = MonotonicMicros();
    for (std::size_t page = 0; page < kPages; ++page) {
        static_cast<volatile char*>(pages)[page * kPageBytes] = 1;
    }
    return static_cast<double>(MonotonicMicros() - begin) / kPages;
}

template <typename Work>
void InChild(const Work& work) {
    const pid_t child = ::fork();
    if (child == 0) {
        work();
        ::_exit(0);
    }
    ::waitpid(child, nullptr, 0);
}

}  // namespace

int main() {
    void* memory = ::mmap(nullptr, kPages * kPageBytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) {
        return 1;
    }
    auto* pages = static_cast<char*>(memory);
    std::cout << "a page's first use " << MicrosAPage(pages) << " µs, " << std::flush;
    InChild([pages] { std::cout << "a page's copy " << MicrosAPage(pages) << " µs, " << std::flush; });
    const std::int64_t begin = MonotonicMicros();
    for (int i = 0; i < kForks; ++i) {
        InChild([] {});
    }
    std::cout << "a fork " << static_cast<double>(MonotonicMicros() - begin) / kForks << " µs\n";
}
