// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/status_publisher.h"

#include <exception>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

StatusPublisher::StatusPublisher(std::function<void(const States&)> write) : write_(std::move(write)) {
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void StatusPublisher::Publish(States states) {
    const std::lock_guard lock(mutex_);
    next_ = std::move(states);
    published_.notify_one();
}

void StatusPublisher::Run(const std::stop_token& stop) {
    std::optional<States> written;
    for (std::unique_lock lock(mutex_); published_.wait(lock, stop, [this] { return next_.has_value(); });) {
        const States states = *std::exchange(next_, std::nullopt);
        lock.unlock();
        if (states != written && TryToWrite(states)) {
            written = states;
        }
        lock.lock();
    }
    has_ended_ = true;
}

bool StatusPublisher::TryToWrite(const States& states) noexcept {
    try {
        write_(states);
        return true;
    } catch (const std::exception& failure) {
        base::LogWarning(failure.what());
        return false;
    }
}

}  // namespace lookhaven::recorder
