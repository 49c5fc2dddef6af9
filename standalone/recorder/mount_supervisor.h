// SPDX-License-Identifier: Apache-2.0
//
// Starts and stops the maintenance of each mount, and redirects cameras from mounts that cannot be recorded to.
//
// Thread safety The recorder's main thread alone, but for what says otherwise.
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/mount_counters.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/recorder/catalog.h"
#include "standalone/recorder/mount_maintenance.h"
#include "standalone/recorder/start_attempts.h"

namespace lookhaven::recorder {

class MountSupervisor {
  public:
    // host_offline_limit: as in StreamSupervisor. The functions are those of MaintenanceContext; they, and the
    // installation, must outlive this object.
    MountSupervisor(const base::Installation& installation, std::chrono::microseconds host_offline_limit,
                    std::function<std::optional<int>()> first_reserved_id, maintenance::FootageIsComplete is_complete);

    // Starts and stops the maintenance of mounts to match the catalog.
    void Reconcile(const CatalogContents& catalog);
    // Call every second: each mount does what is due.
    void Ask();
    std::vector<maintenance::MountStatus> States() const;
    std::vector<control::MountCounters> Counters() const;

    // Changes the plan's mount to the one that is to be recorded to now: none while another recorder uses it, and the
    // fallback while a shared one is not mounted here.
    void Redirect(CameraPlan& plan) const;

    // Any thread. A disk is full: retention runs at once.
    void RequestSpace() { ++space_requests_; }
    // Any thread. Whether every mount that is recorded to is known and recovered, as MountMaintenance::IsRecovered.
    bool AreRecovered() const { return are_recovered_; }

    // As in StoreThread.
    void RequestStop();
    bool HasEnded() const;

  private:
    MaintenanceContext Context() const;

    const base::Installation& installation_;
    const std::chrono::microseconds host_offline_limit_;
    const std::function<std::optional<int>()> first_reserved_id_;
    const maintenance::FootageIsComplete is_complete_;
    std::set<int> held_;  // mounts whose space did not come back, as an earlier recorder reported
    StartAttempts starts_;
    std::atomic<int> space_requests_ = 0;
    std::atomic<bool> are_recovered_ = false;
    std::map<int, std::unique_ptr<MountMaintenance>> mounts_;  // by id; last: their threads use the others
};

}  // namespace lookhaven::recorder
