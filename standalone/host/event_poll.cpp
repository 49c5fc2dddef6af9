// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/event_poll.h"

#include <algorithm>
#include <array>

#include <sys/epoll.h>

#include "standalone/base/file.h"

namespace lookhaven::host {

namespace {

int MillisUntil(Clock::time_point due) {
    using std::chrono::milliseconds;
    if (due == Clock::time_point::max()) {
        return -1;
    }
    return static_cast<int>(std::max(std::chrono::ceil<milliseconds>(due - Clock::now()), milliseconds{0}).count());
}

}  // namespace

EventPoll::EventPoll() : poll_(::epoll_create1(EPOLL_CLOEXEC)) {
    if (!poll_) {
        base::ThrowErrno("cannot set up the host");
    }
}

void EventPoll::Watch(int descriptor, Awaited kind, std::uint32_t id, std::uint32_t events) {
    epoll_event event{};
    event.events = events;
    event.data.u64 = (std::uint64_t{static_cast<std::uint32_t>(kind)} << 32) | id;
    if (::epoll_ctl(poll_.Get(), EPOLL_CTL_ADD, descriptor, &event) != 0 &&
        ::epoll_ctl(poll_.Get(), EPOLL_CTL_MOD, descriptor, &event) != 0) {
        base::ThrowErrno("cannot watch a descriptor");
    }
}

void EventPoll::Wait(Clock::time_point due, const std::function<void(Awaited kind, std::uint32_t id)>& handle) const {
    std::array<epoll_event, 64> events{};
    const int ready = ::epoll_wait(poll_.Get(), events.data(), static_cast<int>(events.size()), MillisUntil(due));
    for (int i = 0; i < ready; ++i) {
        const std::uint64_t tag = events[static_cast<std::size_t>(i)].data.u64;
        handle(static_cast<Awaited>(tag >> 32), static_cast<std::uint32_t>(tag));
    }
}

}  // namespace lookhaven::host
