// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/huge_pages.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include <malloc.h>
#include <sys/mman.h>
#include <unistd.h>

namespace lookhaven::binding {

namespace {

constexpr int kHeapBytes = 64 << 20;          // address space; memory only where it is used
constexpr std::size_t kProbeBytes = 1 << 20;  // more than a heap of a few requests has free
constexpr std::uintptr_t kHugePageBytes = 2 << 20;

}  // namespace

void PrepareForManyObjects() {
    static bool done = false;
    if (done) {
        return;
    }
    done = true;
    ::mallopt(M_MMAP_THRESHOLD, kHeapBytes / 2);  // what a long text outgrows is used again
    ::mallopt(M_TRIM_THRESHOLD, 2 * kHeapBytes);
    ::mallopt(M_TOP_PAD, kHeapBytes);
    void* probe = std::malloc(kProbeBytes);
    const auto begin = (reinterpret_cast<std::uintptr_t>(probe) + kHugePageBytes - 1) & ~(kHugePageBytes - 1);
    const auto end = reinterpret_cast<std::uintptr_t>(::sbrk(0));
    if (probe != nullptr && begin < end && end - begin <= 2 * std::uintptr_t{kHeapBytes}) {
        ::madvise(reinterpret_cast<void*>(begin), end - begin, MADV_HUGEPAGE);
    }
    std::free(probe);
}

}  // namespace lookhaven::binding
