// SPDX-License-Identifier: Apache-2.0
//
// A disk on which a file that its folder lists cannot be examined. Defines fstatat: include it in one
// source of a program.
#pragma once

#include <atomic>
#include <cerrno>
#include <cstring>

#include <dlfcn.h>
#include <sys/stat.h>

namespace lookhaven::test {

// The file's name, borrowed; none by default.
inline std::atomic<const char*> g_unreadable = nullptr;

}  // namespace lookhaven::test

// Stands in front of the C library's.
extern "C" int fstatat(int folder, const char* name, struct stat* status, int flags) noexcept {
    // By the name that it has where sizes and times have 64 bits.
    constexpr const char* kName = sizeof(void*) == 8 ? "fstatat64" : "__fstatat64_time64";
    static const auto real = reinterpret_cast<decltype(&fstatat)>(::dlsym(RTLD_NEXT, kName));
    const char* const unreadable = lookhaven::test::g_unreadable;
    if (unreadable != nullptr && std::strcmp(name, unreadable) == 0) {
        errno = EIO;
        return -1;
    }
    return real(folder, name, status, flags);
}
