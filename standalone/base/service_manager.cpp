// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/service_manager.h"

#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::base {

namespace {

std::string_view Variable(const char* name) {
    const char* value = std::getenv(name);
    return value == nullptr ? "" : value;
}

void Tell(std::string_view state) {
    const std::string_view path = Variable("NOTIFY_SOCKET");
    sockaddr_un address{};
    if (path.empty() || path.size() >= sizeof address.sun_path) {
        return;
    }
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, path.size());
    if (path.front() == '@') {
        address.sun_path[0] = '\0';  // no file, but a name of the kernel's
    }
    const FileDescriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    ::sendto(socket.Get(), state.data(), state.size(), MSG_NOSIGNAL | MSG_DONTWAIT,
             reinterpret_cast<const sockaddr*>(&address),
             static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path.size()));
}

}  // namespace

void NotifyReady() {
    Tell("READY=1");
}

void NotifyStopping() {
    Tell("STOPPING=1");
}

void NotifyAlive() {
    Tell("WATCHDOG=1");
}

std::chrono::milliseconds AliveInterval() {
    const std::string_view limit = Variable("WATCHDOG_USEC");
    const std::string_view process = Variable("WATCHDOG_PID");
    std::int64_t limit_us = 0;
    std::from_chars(limit.data(), limit.data() + limit.size(), limit_us);
    if (limit_us <= 0 || (!process.empty() && process != std::to_string(::getpid()))) {
        return std::chrono::hours(1);
    }
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::microseconds(limit_us / 2));
}

}  // namespace lookhaven::base
