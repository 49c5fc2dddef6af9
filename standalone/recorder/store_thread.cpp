// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/store_thread.h"

#include <exception>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

StoreThread::StoreThread(std::string store_url, std::string purpose, Work work, Idle idle)
    : store_url_(std::move(store_url)),
      purpose_(std::move(purpose)),
      work_(std::move(work)),
      idle_(idle) {
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void StoreThread::Ask() {
    const std::lock_guard lock(mutex_);
    is_asked_ = true;
    asked_.notify_one();
}

void StoreThread::Run(const std::stop_token& stop) {
    for (std::unique_lock lock(mutex_); asked_.wait(lock, stop, [this] { return is_asked_; });) {
        is_asked_ = false;
        lock.unlock();
        TryToWork(stop);
        lock.lock();
    }
    has_ended_ = true;
}

void StoreThread::TryToWork(const std::stop_token& stop) noexcept {
    try {
        if (!store_) {
            store_.emplace(store::Store::Open(store_url_));
        }
        work_(*store_, stop);
        if (idle_ == Idle::kCloses) {
            store_.reset();
        }
        if (!std::exchange(reported_failure_, {}).empty()) {
            base::LogInfo("can " + purpose_ + " again");
        }
    } catch (const std::exception& failure) {
        store_.reset();
        if (failure.what() != reported_failure_) {
            reported_failure_ = failure.what();
            base::LogError("cannot " + purpose_ + ": " + reported_failure_);
        }
    }
}

}  // namespace lookhaven::recorder
