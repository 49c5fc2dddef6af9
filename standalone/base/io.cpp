// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/io.h"

#include <cerrno>

#include <unistd.h>

namespace lookhaven::base {

namespace {

// Calls step with how much is done until all is, or it returns 0. Nothing when it fails.
template <typename Step>
std::optional<std::size_t> Transfer(std::size_t size, Step step) {
    std::size_t done = 0;
    while (done < size) {
        const ssize_t count = step(done);
        if (count == 0) {
            break;
        }
        if (count > 0) {
            done += static_cast<std::size_t>(count);
        } else if (errno != EINTR) {
            return std::nullopt;
        }
    }
    return done;
}

}  // namespace

std::optional<std::size_t> ReadAll(int descriptor, void* data, std::size_t size) {
    return Transfer(size,
                    [&](std::size_t done) { return ::read(descriptor, static_cast<char*>(data) + done, size - done); });
}

std::optional<std::size_t> ReadAllAt(int descriptor, void* data, std::size_t size, std::uint64_t offset) {
    return Transfer(size, [&](std::size_t done) {
        return ::pread(descriptor, static_cast<char*>(data) + done, size - done, static_cast<off_t>(offset + done));
    });
}

bool WriteAll(int descriptor, const void* data, std::size_t size) {
    return Transfer(size, [&](std::size_t done) {
               return ::write(descriptor, static_cast<const char*>(data) + done, size - done);
           }) == size;
}

bool WriteAllAt(int descriptor, const void* data, std::size_t size, std::uint64_t offset) {
    return Transfer(size, [&](std::size_t done) {
               return ::pwrite(descriptor, static_cast<const char*>(data) + done, size - done,
                               static_cast<off_t>(offset + done));
           }) == size;
}

}  // namespace lookhaven::base
