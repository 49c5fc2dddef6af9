// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/send_queue.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <utility>

#include <arpa/inet.h>
#include <linux/inet_diag.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <linux/sock_diag.h>
#include <linux/sockios.h>
#include <linux/tcp.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

namespace lookhaven::binding {

namespace {

constexpr std::int64_t kShortBytes = 32 * 1024;
constexpr std::int64_t kIntervalUs = 100'000;
constexpr std::int64_t kMaxWaitUs = 10'000'000;
constexpr std::int64_t kMaxRoundTripUs = 500'000;
constexpr int kKeepsUp = 16;

struct Request {
    nlmsghdr head;
    inet_diag_req_v2 body;
};

// False when the addresses are not both of the family.
bool SetAddresses(const TcpConnection& connection, int family, inet_diag_sockid& id) {
    return ::inet_pton(family, connection.local_address.c_str(), id.idiag_src) == 1 &&
           ::inet_pton(family, connection.remote_address.c_str(), id.idiag_dst) == 1;
}

std::optional<Request> RequestFor(const TcpConnection& connection) {
    Request request{};
    request.head.nlmsg_len = sizeof request;
    request.head.nlmsg_type = SOCK_DIAG_BY_FAMILY;
    request.head.nlmsg_flags = NLM_F_REQUEST;
    request.body.sdiag_protocol = IPPROTO_TCP;
    request.body.idiag_ext = 1U << (INET_DIAG_INFO - 1);
    request.body.idiag_states = ~0U;
    inet_diag_sockid& id = request.body.id;
    id.idiag_sport = htons(static_cast<std::uint16_t>(connection.local_port));
    id.idiag_dport = htons(static_cast<std::uint16_t>(connection.remote_port));
    id.idiag_cookie[0] = id.idiag_cookie[1] = INET_DIAG_NOCOOKIE;
    for (const int family : {AF_INET, AF_INET6}) {
        if (SetAddresses(connection, family, id)) {
            request.body.sdiag_family = static_cast<std::uint8_t>(family);
            return request;
        }
    }
    return std::nullopt;
}

}  // namespace

SendQueue::SendQueue(int socket, TcpConnection connection, std::function<std::int64_t()> now_us)
    : socket_(socket),
      connection_(std::move(connection)),
      now_us_(std::move(now_us)) {}

std::int64_t SendQueue::WaitingBytes() const {
    int bytes = 0;
    return ::ioctl(socket_, SIOCOUTQ, &bytes) == 0 ? bytes : 0;
}

// The kernel answers within the call that asks.
std::optional<SendQueue::Tcp> SendQueue::AskTcp() {
    const std::optional<Request> request = RequestFor(connection_);
    // Only streams ask; a process that decodes pictures must not have this socket.
    if (!std::exchange(has_opened_netlink_, true)) {
        netlink_.Reset(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_SOCK_DIAG));
    }
    alignas(nlmsghdr) std::array<char, 1024> answer{};
    if (!request || !netlink_ || ::send(netlink_.Get(), &*request, sizeof *request, 0) < 0) {
        return std::nullopt;
    }
    const ssize_t size = ::recv(netlink_.Get(), answer.data(), answer.size(), 0);
    const auto* head = reinterpret_cast<const nlmsghdr*>(answer.data());
    if (size < static_cast<ssize_t>(NLMSG_LENGTH(sizeof(inet_diag_msg))) || head->nlmsg_type != SOCK_DIAG_BY_FAMILY) {
        return std::nullopt;
    }
    const auto* message = reinterpret_cast<const inet_diag_msg*>(answer.data() + NLMSG_HDRLEN);
    Tcp tcp{message->idiag_wqueue, 0, 0};
    constexpr std::size_t kAttributes = NLMSG_HDRLEN + NLMSG_ALIGN(sizeof(inet_diag_msg));
    for (std::size_t at = kAttributes; at + sizeof(rtattr) <= static_cast<std::size_t>(size);) {
        rtattr attribute{};
        std::memcpy(&attribute, answer.data() + at, sizeof attribute);
        if (attribute.rta_len < sizeof attribute || at + attribute.rta_len > static_cast<std::size_t>(size)) {
            break;
        }
        if (attribute.rta_type == INET_DIAG_INFO) {
            tcp_info info{};
            std::memcpy(&info, answer.data() + at + RTA_LENGTH(0),
                        std::min<std::size_t>(sizeof info, attribute.rta_len - RTA_LENGTH(0)));
            tcp.taken_bytes = static_cast<std::int64_t>(info.tcpi_bytes_acked);
            tcp.round_trip_us = info.tcpi_min_rtt == ~0U ? 0 : info.tcpi_min_rtt;
        }
        at += RTA_ALIGN(attribute.rta_len);
    }
    return tcp;
}

void SendQueue::Measure(const Tcp& tcp, std::int64_t now_us) {
    const std::int64_t passed_us = now_us - measured_us_;
    if (measured_us_ != 0 && passed_us < kIntervalUs) {
        return;
    }
    bytes_before_ = last_bytes_;
    last_bytes_ = measured_us_ == 0 ? 0 : (tcp.taken_bytes - measured_bytes_) * kIntervalUs / passed_us;
    measured_us_ = now_us;
    measured_bytes_ = tcp.taken_bytes;
}

// While the viewer keeps up, the kernel is asked only a few times a second: asking costs a tenth of what sending a
// picture does.
bool SendQueue::IsDrainedNow(std::int64_t now_us) {
    std::int64_t waiting_bytes = WaitingBytes();
    if (drained_in_a_row_ >= kKeepsUp && now_us - asked_us_ < kIntervalUs) {
        return waiting_bytes <= kShortBytes;
    }
    asked_us_ = now_us;
    if (const std::optional<Tcp> tcp = AskTcp()) {
        Measure(*tcp, now_us);
        waiting_bytes += tcp->waiting_bytes;
        round_trip_us_ = std::min<std::int64_t>(tcp->round_trip_us, kMaxRoundTripUs);
    }
    // The buffers of a slow viewer's machine may take a lot at once: one interval says little.
    const std::int64_t taken_bytes = std::min(last_bytes_, bytes_before_);
    return waiting_bytes <= std::max(kShortBytes, taken_bytes * (kIntervalUs + round_trip_us_) / kIntervalUs);
}

bool SendQueue::IsDrained() {
    const std::int64_t now_us = now_us_();
    if (IsDrainedNow(now_us)) {
        ++drained_in_a_row_;
        long_since_us_.reset();
        return true;
    }
    drained_in_a_row_ = 0;
    long_since_us_ = long_since_us_.value_or(now_us);
    return false;
}

bool SendQueue::TakeOverduePicture() {
    if (!long_since_us_ || now_us_() - *long_since_us_ < kMaxWaitUs) {
        return false;
    }
    long_since_us_.reset();
    return true;
}

}  // namespace lookhaven::binding
