// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/mount_supervisor.h"

#include <algorithm>
#include <exception>
#include <string>
#include <utility>

#include "standalone/base/log.h"

namespace lookhaven::recorder {

MountSupervisor::MountSupervisor(const base::Installation& installation, std::chrono::microseconds host_offline_limit,
                                 std::function<std::optional<int>()> first_reserved_id,
                                 maintenance::FootageIsComplete is_complete)
    : installation_(installation),
      host_offline_limit_(host_offline_limit),
      first_reserved_id_(std::move(first_reserved_id)),
      is_complete_(std::move(is_complete)) {
    try {
        for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation)) {
            if (status.state == maintenance::MountState::kSpaceHeld) {
                held_.insert(status.mount);
            }
        }
    } catch (const std::exception& failure) {
        base::LogWarning(std::string("cannot read what the previous recorder reported of mounts: ") + failure.what());
    }
}

void MountSupervisor::Reconcile(const CatalogContents& catalog) {
    std::erase_if(mounts_, [](const auto& entry) { return entry.second->HasEnded(); });
    bool are_recovered = catalog.is_read;
    for (const auto& [id, mount] : mounts_) {
        if (!catalog.mounts.contains(id)) {
            mount->RequestStop();
        }
    }
    for (const auto& [id, is_enabled] : catalog.mounts) {
        if (!mounts_.contains(id)) {
            starts_.Try("maintenance of mount " + std::to_string(id), [&, id = id] {
                mounts_.emplace(id, std::make_unique<MountMaintenance>(id, Context(), held_.contains(id)));
            });
        }
        const auto mount = mounts_.find(id);
        are_recovered &= !is_enabled || (mount != mounts_.end() && mount->second->IsRecovered());
    }
    are_recovered_ = are_recovered;
}

void MountSupervisor::Ask() {
    for (const auto& [id, mount] : mounts_) {
        mount->Ask();
    }
}

std::vector<maintenance::MountStatus> MountSupervisor::States() const {
    std::vector<maintenance::MountStatus> states;
    for (const auto& [id, mount] : mounts_) {
        states.push_back(mount->Status());
    }
    return states;
}

std::vector<control::MountCounters> MountSupervisor::Counters() const {
    std::vector<control::MountCounters> counters;
    for (const auto& [id, mount] : mounts_) {
        counters.push_back(mount->Counters());
    }
    return counters;
}

void MountSupervisor::Redirect(CameraPlan& plan) const {
    const auto mount = mounts_.find(plan.mount_id);
    if (mount == mounts_.end()) {
        return;
    }
    const maintenance::MountState state = mount->second->Status().state;
    if (state == maintenance::MountState::kInUse) {
        plan.mount_id = 0;
    } else if (state == maintenance::MountState::kNotMounted && plan.fallback_mount_id != 0) {
        plan.mount_id = plan.fallback_mount_id;
        plan.mount = plan.fallback_mount;
    }
}

void MountSupervisor::RequestStop() {
    for (const auto& [id, mount] : mounts_) {
        mount->RequestStop();
    }
}

bool MountSupervisor::HasEnded() const {
    return std::ranges::all_of(mounts_, [](const auto& entry) { return entry.second->HasEnded(); });
}

MaintenanceContext MountSupervisor::Context() const {
    return {.store_url = installation_.StoreUrl(),
            .first_reserved_id = first_reserved_id_,
            .is_complete = is_complete_,
            .space_requests = space_requests_,
            .host = installation_.HostId(),
            .offline_us = host_offline_limit_.count()};
}

}  // namespace lookhaven::recorder
