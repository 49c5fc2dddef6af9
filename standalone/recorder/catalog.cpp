// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/catalog.h"

#include <exception>
#include <utility>

#include "standalone/base/log.h"
#include "standalone/store/cameras.h"
#include "standalone/store/settings.h"

namespace lookhaven::recorder {

void Catalog::Refresh() noexcept {
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
    std::map<ring::LiveStream, StreamPlan> streams;
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
            streams.emplace(ring::LiveStream{camera.id, profile.number}, std::move(plan));
        }
    }
    streams_ = std::move(streams);
    revision_ = revision;
}

}  // namespace lookhaven::recorder
