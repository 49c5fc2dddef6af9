// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/catalog.h"

#include <exception>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/log.h"
#include "standalone/store/cameras.h"
#include "standalone/store/settings.h"

namespace lookhaven::recorder {

Catalog::Catalog(std::string store_url, std::function<void()> on_change)
    : store_url_(std::move(store_url)),
      on_change_(std::move(on_change)) {
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void Catalog::Refresh() {
    const std::lock_guard lock(mutex_);
    is_asked_ = true;
    asked_.notify_one();
}

std::shared_ptr<const Catalog::Streams> Catalog::Current() const {
    const std::lock_guard lock(mutex_);
    return current_;
}

void Catalog::Run(const std::stop_token& stop) {
    for (std::unique_lock lock(mutex_); asked_.wait(lock, stop, [this] { return is_asked_; });) {
        is_asked_ = false;
        lock.unlock();
        TryToRead();
        lock.lock();
    }
    has_ended_ = true;
}

void Catalog::TryToRead() noexcept {
    try {
        Read();
        if (!std::exchange(reported_failure_, {}).empty()) {
            base::LogInfo("the store can be read again");
        }
    } catch (const std::exception& failure) {
        store_.reset();
        if (failure.what() != reported_failure_) {
            reported_failure_ = failure.what();
            base::LogError("cannot read the cameras, running streams go on: " + reported_failure_);
        }
    }
}

void Catalog::Read() {
    if (!store_) {
        store_.emplace(store::Store::Open(store_url_));
    }
    // Read before the cameras: a change in between is then seen the next time.
    const std::int64_t revision = store::Settings(*store_).Revision();
    if (revision == revision_) {
        return;
    }
    store::Cameras cameras(*store_);
    auto streams = std::make_shared<Streams>();
    for (const store::Camera& camera : cameras.List()) {
        if (!camera.enabled) {
            continue;
        }
        const std::optional<store::Credentials> credentials = cameras.FindCredentials(camera.id);
        for (const store::CameraProfile& profile : camera.profiles) {
            StreamPlan plan{camera.name, profile.source, {}};
            if (credentials) {
                plan.credentials = {credentials->account, credentials->password};
            }
            streams->emplace(ring::LiveStream{camera.id, profile.number}, std::move(plan));
        }
    }
    revision_ = revision;
    {
        const std::lock_guard lock(mutex_);
        current_ = std::move(streams);
    }
    on_change_();
}

}  // namespace lookhaven::recorder
