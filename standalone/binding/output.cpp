// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/output.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <utility>

#include <poll.h>
#include <sys/random.h>
#include <sys/socket.h>

#include "standalone/base/file.h"
#include "standalone/base/text.h"
#include "standalone/binding/player_end.h"

namespace lookhaven::binding {

namespace {

using Clock = std::chrono::steady_clock;

// A picture may hold any bytes, so nobody should be able to foresee what ends a part.
std::string RandomBoundary() {
    std::array<unsigned char, 12> bytes{};
    if (::getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
        base::ThrowErrno("cannot make a boundary");
    }
    return "part-" + base::ToHex(bytes);
}

// Drops the bytes from the front; returns the pieces that are left.
std::span<iovec> Advance(std::span<iovec> pieces, std::size_t bytes) {
    while (!pieces.empty() && bytes >= pieces.front().iov_len) {
        bytes -= pieces.front().iov_len;
        pieces = pieces.subspan(1);
    }
    if (!pieces.empty()) {
        pieces.front().iov_base = static_cast<char*>(pieces.front().iov_base) + bytes;
        pieces.front().iov_len -= bytes;
    }
    return pieces;
}

}  // namespace

Output::Output(int socket, OutputLimits limits, std::function<bool()> is_to_leave)
    : socket_(socket),
      limits_(limits),
      is_to_leave_(std::move(is_to_leave)),
      stream_(::fopencookie(this, "w", {nullptr, &Output::WriteCookie, nullptr, nullptr})),
      replaced_(stdout),
      boundary_(RandomBoundary()) {
    if (stream_ == nullptr) {
        base::ThrowErrno("cannot open the output");
    }
    stdout = stream_;
}

Output::~Output() {
    std::fclose(stream_);
    stdout = replaced_;
}

bool Output::Send(std::span<iovec> pieces) {
    std::fflush(stream_);
    if (!broken_ && SendAll(pieces)) {
        return true;
    }
    // A write that fails is what makes stdio remember the error.
    std::fputc('\0', stream_);
    std::fflush(stream_);
    return false;
}

ssize_t Output::WriteCookie(void* self, const char* data, std::size_t size) {
    std::array<iovec, 1> piece{{{const_cast<char*>(data), size}}};
    Output& output = *static_cast<Output*>(self);
    if (!output.broken_ && output.SendAll(piece)) {
        return static_cast<ssize_t>(size);
    }
    errno = EPIPE;
    return 0;
}

bool Output::SendAll(std::span<iovec> pieces) {
    interrupted_until_ = Clock::time_point::max();
    Clock::time_point progress = Clock::now();
    for (pieces = Advance(pieces, 0); !pieces.empty();) {
        msghdr message{};
        message.msg_iov = pieces.data();
        message.msg_iovlen = pieces.size();
        const ssize_t sent = ::sendmsg(socket_, &message, MSG_DONTWAIT | MSG_NOSIGNAL);
        if (sent > 0) {
            bytes_sent_ += static_cast<std::uint64_t>(sent);
            pieces = Advance(pieces, static_cast<std::size_t>(sent));
            progress = Clock::now();
        } else if (errno == EINTR) {
            continue;
        } else if (errno != EAGAIN || !WaitUntilWritable(progress)) {
            Break();
            return false;
        }
    }
    return true;
}

bool Output::WaitUntilWritable(Clock::time_point progress) {
    for (;;) {
        const Clock::time_point until = std::min(progress + limits_.stalled, interrupted_until_);
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(until - Clock::now());
        if (left.count() <= 0) {
            return false;
        }
        pollfd writable{socket_, POLLOUT, 0};
        const int ready = ::poll(&writable, 1, static_cast<int>(left.count()));
        if (ready > 0) {
            return true;
        }
        if (ready < 0 && interrupted_until_ == Clock::time_point::max() && is_to_leave_()) {
            interrupted_until_ = Clock::now() + limits_.interrupted;
        }
    }
}

void Output::Break() {
    broken_ = true;
    LeavePlayerFile();
    std::raise(SIGTERM);
}

}  // namespace lookhaven::binding
