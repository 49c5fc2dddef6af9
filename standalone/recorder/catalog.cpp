// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/catalog.h"

#include <utility>

#include "standalone/base/log.h"
#include "standalone/store/cameras.h"
#include "standalone/store/hosts.h"
#include "standalone/store/sessions.h"
#include "standalone/store/settings.h"

namespace lookhaven::recorder {

namespace {

CameraPlan PlanOf(const store::Camera& camera, const std::map<int, store::RecordingPlan>& plans, store::Mounts& mounts,
                  int host) {
    const auto found = plans.find(camera.id);
    const store::RecordingPlan plan = found == plans.end() ? store::NoPlan() : found->second;
    const bool has_profile = found != plans.end() && camera.FindProfile(plan.profile) != nullptr;
    CameraPlan result;
    result.camera_name = camera.name;
    result.mode = plan.mode;
    result.segment_s = plan.segment_s;
    result.pre_s = plan.pre_s;
    result.stream = has_profile ? plan.profile : camera.live_profile;
    result.live_profile = camera.live_profile;
    result.video_type = camera.video_type;
    result.hours = plan.hours;
    if (const std::optional<store::Mount> mount = mounts.FindForPlan(plan.mount_id, host); mount && mount->enabled) {
        result.mount_id = mount->id;
        result.mount = mount->path;
        const auto own = mount->IsShared() ? mounts.FindForPlan(0, host) : std::nullopt;
        if (own && own->enabled && !own->IsShared()) {
            result.fallback_mount_id = own->id;
            result.fallback_mount = own->path;
        }
    }
    return result;
}

std::map<int, OtherHost> OtherHosts(store::Store& store, int own) {
    std::map<int, OtherHost> others;
    if (own == 0) {
        return others;
    }
    const std::string key = store::Sessions(store).Key();
    for (const store::Host& host : store::Hosts(store).All()) {
        if (host.id != own) {
            others.emplace(host.id,
                           OtherHost{host.id, host.name, {host.address, host.port, host.certificate}, key, own});
        }
    }
    return others;
}

}  // namespace

Catalog::Catalog(const std::string& store_url, int host, std::function<void()> on_change)
    : host_(host),
      on_change_(std::move(on_change)),
      thread_(store_url, "read the cameras", [this](store::Store& store, const std::stop_token&) { Read(store); }) {}

std::shared_ptr<const CatalogContents> Catalog::Current() const {
    const std::lock_guard lock(mutex_);
    return current_;
}

void Catalog::CorrectVideoType(int camera, base::Codec type) {
    const std::lock_guard lock(mutex_);
    corrections_[camera] = type;
}

// A store that can only be read is read all the same.
void Catalog::WriteVideoTypes(store::Store& store) {
    std::map<int, base::Codec> corrections;
    {
        const std::lock_guard lock(mutex_);
        corrections.swap(corrections_);
    }
    for (const auto& [camera, type] : corrections) {
        try {
            store::Cameras(store).SetVideoType(camera, type);
        } catch (const store::StoreError& failure) {
            base::Log(base::Severity::kDebug, std::string("cannot store what a camera sends: ") + failure.what());
        }
    }
}

void Catalog::Read(store::Store& store) {
    WriteVideoTypes(store);
    // Read before the cameras: a change in between is then seen the next time.
    const std::int64_t revision = store::Settings(store).Revision();
    if (revision == revision_) {
        return;
    }
    store::Cameras cameras(store);
    store::Mounts mounts(store);
    const std::map<int, store::RecordingPlan> plans = store::RecordingPlans(store).List();
    const std::string installation = store::Settings(store).Installation();
    auto contents = std::make_shared<CatalogContents>();
    for (const store::Camera& camera : cameras.List()) {
        if (!camera.enabled) {
            continue;
        }
        const std::optional<store::Credentials> credentials = cameras.FindCredentials(camera.id);
        for (const store::CameraProfile& profile : camera.profiles) {
            StreamPlan plan{camera.name, profile.source, {}, camera.insecure};
            if (credentials) {
                plan.credentials = {credentials->account, credentials->password};
            }
            contents->streams.emplace(control::LiveStream{camera.id, profile.number}, std::move(plan));
        }
        CameraPlan plan = PlanOf(camera, plans, mounts, host_);
        plan.installation = installation;
        contents->cameras.emplace(camera.id, std::move(plan));
    }
    contents->hosts = OtherHosts(store, host_);
    for (const store::Mount& mount : mounts.List()) {
        if (mount.IsOf(host_)) {
            contents->mounts.emplace(mount.id, mount.enabled);
        }
    }
    contents->is_read = true;
    revision_ = revision;
    {
        const std::lock_guard lock(mutex_);
        current_ = std::move(contents);
    }
    on_change_();
}

}  // namespace lookhaven::recorder
