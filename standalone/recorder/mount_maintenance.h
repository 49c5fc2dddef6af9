// SPDX-License-Identifier: Apache-2.0
//
// Maintains one mount in a thread of its own: recovery, the footage of marks, retention.
//
// Why so        A disk that fails or hangs must not keep the other mounts from being maintained.
// Thread safety Any thread; nothing here waits for a disk or the store.
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string>

#include "standalone/base/clock.h"
#include "standalone/control/mount_counters.h"
#include "standalone/maintenance/clock_watch.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_lock.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/retention.h"
#include "standalone/recorder/mount_lease_keeper.h"
#include "standalone/recorder/store_thread.h"
#include "standalone/store/mounts.h"

namespace lookhaven::recorder {

// What the maintenance of all mounts shares. Borrowed: everything in it outlives them.
struct MaintenanceContext {
    std::string store_url;
    std::function<std::optional<int>()> first_reserved_id;  // as EventRowQueue::FirstReservedId
    maintenance::FootageIsComplete is_complete;
    const std::atomic<int>& space_requests;  // grows when a disk is full
    std::function<std::int64_t()> monotonic_us = base::MonotonicMicros;
    std::function<std::int64_t()> wall_s = base::WallSeconds;
    int host = 0;                 // this machine among store/hosts.h; 0: the only one
    std::int64_t offline_us = 0;  // as in HostWatch
};

class MountMaintenance {
  public:
    // Starts the thread. is_space_held: an earlier recorder reported kSpaceHeld. Throws std::system_error when no
    // thread can be started.
    MountMaintenance(int mount_id, MaintenanceContext context, bool is_space_held);

    // Call every second: does what is due; does not wait. After a failure it pauses, longer after each.
    void Ask() { thread_.Ask(); }

    maintenance::MountStatus Status() const;
    // Since this object was made.
    control::MountCounters Counters() const;
    // Whether nothing is left to recover here from an earlier recorder of this host; true also while a shared mount is
    // not mounted here, since cameras are recorded elsewhere meanwhile.
    bool IsRecovered() const { return is_recovered_; }

    // As in StoreThread.
    void RequestStop() { thread_.RequestStop(); }
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    // Doubles with each failure in a row.
    struct Pause {
        std::int64_t length_us = 0;
        std::int64_t until_us = 0;

        void Begin(std::int64_t now_us);
    };

    // The wall clock, read once for all that a pass decides by it.
    struct Clock {
        std::int64_t now_s;
        bool is_trusted;
    };

    void Work(store::Store& store);
    // False where a shared mount's folder fails: try again after a pause.
    bool Maintain(store::Store& store, const store::Mount& mount, const Clock& clock);
    void EnforceRetention(store::Store& store, const store::Mount& mount, const Clock& clock);
    std::optional<maintenance::MountFolder> Open(store::Store& store, const store::Mount& mount, std::string& failure);
    bool IsClockInStep(store::Store& store, const store::Mount& mount, const Clock& clock);
    bool Acquire(store::Store& store, const store::Mount& mount);
    void Recover(store::Store& store, const store::Mount& mount, const Clock& clock);
    void SetStatus(maintenance::MountState state, const std::string& reason);

    const int mount_id_;
    const MaintenanceContext context_;

    // Only the thread uses these.
    std::string recovery_failure_;  // of the last attempt
    maintenance::ClockWatch clock_watch_;
    maintenance::MountLock lock_;  // of a mount that is not shared
    MountLeaseKeeper lease_;       // of one that is
    bool must_recover_ = true;     // at the next pass: the disk, the lease or the hosts have changed
    maintenance::DiskWatch disk_watch_;
    Pause after_failure_;
    Pause after_recovery_;
    std::int64_t next_retention_us_ = 0;
    bool is_full_of_kept_ = false;
    bool is_clock_in_step_ = true;
    int seen_space_requests_ = 0;

    std::atomic<bool> is_recovered_ = false;
    mutable std::mutex mutex_;
    maintenance::MountStatus status_;
    control::MountCounters counters_;
    StoreThread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
