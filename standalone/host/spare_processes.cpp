// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/spare_processes.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <string>
#include <utility>

#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/host/scgi.h"

namespace lookhaven::host {

namespace {

constexpr const char* kSpareName = "webapi-spare";  // in a list of processes
constexpr char kReady = 'r';
// A head, an awaited body, or one chunk of a large one.
constexpr std::size_t kMaxRequestBytes = 64 * 1024;

// One message: the slot's number, the request, and the connection beside it.
class RequestMessage {
  public:
    // Borrows both.
    RequestMessage(std::uint32_t& slot, std::string& request)
        : pieces_{{{&slot, sizeof slot}, {request.data(), request.size()}}} {
        message_.msg_iov = pieces_.data();
        message_.msg_iovlen = pieces_.size();
        message_.msg_control = control_.data();
        message_.msg_controllen = control_.size();
    }
    RequestMessage(const RequestMessage&) = delete;
    RequestMessage& operator=(const RequestMessage&) = delete;

    msghdr& Header() { return message_; }

  private:
    std::array<iovec, 2> pieces_;
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control_{};
    msghdr message_{};
};

bool SendRequest(int channel, std::uint32_t slot, std::string& request, int connection) {
    RequestMessage message(slot, request);
    cmsghdr* rights = CMSG_FIRSTHDR(&message.Header());
    rights->cmsg_level = SOL_SOCKET;
    rights->cmsg_type = SCM_RIGHTS;
    rights->cmsg_len = CMSG_LEN(sizeof connection);
    std::memcpy(CMSG_DATA(rights), &connection, sizeof connection);
    return ::sendmsg(channel, &message.Header(), MSG_DONTWAIT | MSG_NOSIGNAL) > 0;
}

// The connection; -1 when the host wants this process no more.
int ReceiveRequest(int channel, std::uint32_t& slot, std::string& request) {
    request.resize(kMaxRequestBytes);
    RequestMessage message(slot, request);
    ssize_t got = 0;
    do {
        got = ::recvmsg(channel, &message.Header(), MSG_CMSG_CLOEXEC);
    } while (got < 0 && errno == EINTR);
    const cmsghdr* rights = got > 0 ? CMSG_FIRSTHDR(&message.Header()) : nullptr;
    if (rights == nullptr || static_cast<std::size_t>(got) < sizeof slot) {
        return -1;
    }
    request.resize(static_cast<std::size_t>(got) - sizeof slot);
    int connection = -1;
    std::memcpy(&connection, CMSG_DATA(rights), sizeof connection);
    return connection;
}

}  // namespace

SpareProcesses::SpareProcesses(std::size_t count, control::SlotTable& slots, Work work)
    : count_(count),
      slots_(slots),
      work_(std::move(work)) {}

const Child* SpareProcesses::Start() {
    std::array<int, 2> ends{-1, -1};
    if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()) != 0) {
        return nullptr;
    }
    base::FileDescriptor own(ends[0]);
    const base::FileDescriptor other(ends[1]);
    // Before the fork, so that no list of processes shows one that waits as one that serves a request.
    std::array<char, 16> own_name{};
    ::prctl(PR_GET_NAME, own_name.data());
    ::prctl(PR_SET_NAME, kSpareName);
    std::optional<Child> child = StartChild(
        "a spare process", [&, channel = other.Get()] { WaitForRequest(work_.leave_host(channel), own_name.data()); });
    ::prctl(PR_SET_NAME, own_name.data());
    if (!child) {
        return nullptr;
    }
    return &spares_.emplace_back(Spare{*std::move(child), std::move(own)}).child;
}

void SpareProcesses::WaitForRequest(int channel, const char* name) const {
    work_.prepare();
    if (::send(channel, &kReady, 1, MSG_NOSIGNAL) != 1) {
        return;
    }
    std::uint32_t slot = 0;
    std::string text;
    const int connection = ReceiveRequest(channel, slot, text);
    if (connection < 0) {
        return;
    }
    ::dup2(connection, STDOUT_FILENO);
    ::close(connection);
    ::close(channel);
    ::prctl(PR_SET_NAME, name);
    ScgiParser parser;
    const ScgiParser::State state = parser.Feed(text);
    http::Wipe(text);
    if (state != ScgiParser::State::kComplete) {
        throw std::logic_error("the host has handed over half a request");
    }
    http::Request request = parser.TakeRequest();
    work_.serve(request, slots_.At(slot));
}

std::optional<Child> SpareProcesses::HandOver(const http::Request& request, int connection, const control::Slot& slot) {
    for (auto spare = spares_.begin(); spare != spares_.end(); ++spare) {
        char byte = 0;
        spare->is_ready = spare->is_ready || ::recv(spare->channel.Get(), &byte, 1, MSG_DONTWAIT) == 1;
        if (!spare->is_ready) {
            continue;
        }
        std::string text = ToScgi(request);
        const auto number = static_cast<std::uint32_t>(slots_.NumberOf(slot));
        const bool is_given =
            text.size() <= kMaxRequestBytes && SendRequest(spare->channel.Get(), number, text, connection);
        http::Wipe(text);
        if (!is_given) {
            return std::nullopt;
        }
        Child child = std::move(spare->child);
        spares_.erase(spare);
        return child;
    }
    return std::nullopt;
}

bool SpareProcesses::Reap(pid_t pid) {
    const auto found = std::ranges::find(spares_, pid, [](const Spare& spare) { return spare.child.pid; });
    if (found == spares_.end()) {
        return false;
    }
    End(*found);
    spares_.erase(found);
    return true;
}

void SpareProcesses::EndAll() {
    std::ranges::for_each(spares_, End);
    spares_.clear();
}

void SpareProcesses::End(const Spare& spare) {
    ::kill(spare.child.pid, SIGKILL);  // not reaped yet, so nobody else has that number
    ::waitpid(spare.child.pid, nullptr, 0);
}

}  // namespace lookhaven::host
