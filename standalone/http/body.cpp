// SPDX-License-Identifier: Apache-2.0
#include "standalone/http/body.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <utility>

#include <poll.h>
#include <sys/socket.h>

#include "standalone/http/answer.h"

namespace lookhaven::http {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kReadLimit{10};
constexpr std::chrono::seconds kDropLimit{1};

// As recv, but gives up at the deadline with EAGAIN.
ssize_t Receive(int connection, char* bytes, std::size_t size, Clock::time_point deadline) {
    for (;;) {
        const ssize_t got = ::recv(connection, bytes, size, MSG_DONTWAIT);
        if (got >= 0 || (errno != EAGAIN && errno != EINTR)) {
            return got;
        }
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
        if (left <= 0) {
            errno = EAGAIN;
            return -1;
        }
        pollfd readable{connection, POLLIN, 0};
        ::poll(&readable, 1, static_cast<int>(left));
    }
}

}  // namespace

void ReadBody(Request& request, int connection) {
    const Clock::time_point deadline = Clock::now() + kReadLimit;
    std::size_t size = request.body.size();
    request.body.resize(size + std::exchange(request.unread_body_bytes, 0));
    while (size < request.body.size()) {
        const ssize_t got = Receive(connection, request.body.data() + size, request.body.size() - size, deadline);
        if (got <= 0) {
            throw got < 0 && errno == EAGAIN ? Failure(408, "the request did not arrive in time")
                                             : Failure(400, "the request ends inside its body");
        }
        size += static_cast<std::size_t>(got);
    }
}

void DropBody(const Request& request, int connection) {
    const Clock::time_point deadline = Clock::now() + kDropLimit;
    std::array<char, 16384> bytes;  // each page of it costs as much as reading it
    for (std::size_t left = request.unread_body_bytes; left > 0;) {
        const ssize_t got = Receive(connection, bytes.data(), std::min(left, bytes.size()), deadline);
        if (got <= 0) {
            return;
        }
        left -= static_cast<std::size_t>(got);
    }
}

}  // namespace lookhaven::http
