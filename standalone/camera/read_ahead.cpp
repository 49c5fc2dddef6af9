// SPDX-License-Identifier: Apache-2.0
//
// Receives from the camera ahead of libav's reads, in this program alone.
//
// Why so        libav reads each packet inside an RTSP connection in three pieces, and polls before each: six system
//               calls for 1,400 bytes, a hundred for a picture. So this program has the calls that libav makes in front
//               of the C library's, as in resolver_guard.cpp: one receives whatever has come, and what was not asked
//               for yet answers the next ones.
// Invariants    What is held belongs to the socket's present connection: a new socket begins with nothing.
// Thread safety One thread.
#include <algorithm>
#include <array>
#include <cstddef>
#include <memory>
#include <new>
#include <span>

#include <poll.h>
#include <sys/socket.h>

#include <dlfcn.h>

namespace {

constexpr std::size_t kBytes = 32'768;
constexpr int kMaxSockets = 16;  // of this process; further ones are read as they are asked for

struct Received {
    bool is_stream = false;
    std::unique_ptr<std::array<std::byte, kBytes>> bytes;
    std::span<const std::byte> unread;
};

// Null for what is no stream.
Received* StreamOf(int socket) {
    static std::array<Received, kMaxSockets> sockets;
    return socket >= 0 && socket < kMaxSockets ? &sockets[static_cast<std::size_t>(socket)] : nullptr;
}

template <class Function>
Function* Real(Function*, const char* name) {
    return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

bool HasUnread(const pollfd& asked) {
    const Received* received = StreamOf(asked.fd);
    return received != nullptr && !received->unread.empty() && asked.events == POLLIN;
}

}  // namespace

extern "C" {

__attribute__((visibility("default"))) int socket(int domain, int type, int protocol) noexcept {
    static const auto real = Real(&socket, "socket");
    const int made = real(domain, type, protocol);
    if (Received* received = StreamOf(made)) {
        constexpr int kTypeBits = 0xF;
        received->is_stream = (type & kTypeBits) == SOCK_STREAM;
        received->unread = {};
    }
    return made;
}

__attribute__((visibility("default"))) ssize_t recv(int from, void* buffer, size_t size, int flags) {
    static const auto real = Real(&recv, "recv");
    Received* received = StreamOf(from);
    if (received == nullptr || !received->is_stream || flags != 0 || (received->unread.empty() && size >= kBytes)) {
        return real(from, buffer, size, flags);
    }
    if (received->unread.empty()) {
        if (received->bytes == nullptr) {
            received->bytes.reset(new (std::nothrow)
                                      std::array<std::byte, kBytes>);  // nothing may be thrown through libav
        }
        if (received->bytes == nullptr) {
            return real(from, buffer, size, flags);
        }
        const ssize_t got = real(from, received->bytes->data(), kBytes, 0);
        if (got <= 0) {
            return got;
        }
        received->unread = std::span(*received->bytes).first(static_cast<std::size_t>(got));
    }
    const std::size_t taken = std::min(size, received->unread.size());
    std::copy_n(received->unread.data(), taken, static_cast<std::byte*>(buffer));
    received->unread = received->unread.subspan(taken);
    return static_cast<ssize_t>(taken);
}

// libav asks about one socket at a time before it reads.
__attribute__((visibility("default"))) int poll(pollfd* asked, nfds_t count, int timeout) {
    static const auto real = Real(&poll, "poll");
    if (count == 1 && HasUnread(*asked)) {
        asked->revents = POLLIN;
        return 1;
    }
    return real(asked, count, timeout);
}

}  // extern "C"
