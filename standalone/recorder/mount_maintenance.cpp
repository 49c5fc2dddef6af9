// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/mount_maintenance.h"

#include <algorithm>
#include <cstdlib>
#include <system_error>
#include <utility>
#include <vector>

#include "standalone/base/log.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_recovery.h"
#include "standalone/store/footage_removals.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::recorder {

namespace {

using maintenance::MountState;

constexpr std::int64_t kRetentionUs = 10'000'000;
constexpr std::int64_t kMinPauseUs = 5'000'000;
constexpr std::int64_t kMaxPauseUs = 600'000'000;
constexpr std::int64_t kMaxClockDifferenceS = 300;

}  // namespace

MountMaintenance::MountMaintenance(int mount_id, MaintenanceContext context, bool is_space_held)
    : mount_id_(mount_id),
      context_(std::move(context)),
      lease_(mount_id, context_.host, context_.offline_us),
      disk_watch_{maintenance::SpaceWatch(is_space_held), maintenance::SpaceWatch(is_space_held)},
      status_{mount_id, is_space_held ? MountState::kSpaceHeld : MountState::kReady, ""},
      counters_{.mount = mount_id},
      thread_(context_.store_url, "maintain mount " + std::to_string(mount_id),
              [this](store::Store& store, const std::stop_token&) { Work(store); }) {}

void MountMaintenance::Pause::Begin(std::int64_t now_us) {
    length_us = std::clamp(2 * length_us, kMinPauseUs, kMaxPauseUs);
    until_us = now_us + length_us;
}

maintenance::MountStatus MountMaintenance::Status() const {
    const std::lock_guard lock(mutex_);
    return status_;
}

control::MountCounters MountMaintenance::Counters() const {
    const std::lock_guard lock(mutex_);
    return counters_;
}

void MountMaintenance::Work(store::Store& store) {
    const std::int64_t now_us = context_.monotonic_us();
    const std::int64_t now_s = context_.wall_s();
    const Clock clock{now_s, clock_watch_.IsTrusted(now_us, now_s)};
    // Without ids of its own the recorder could not tell its events from those of another one.
    if (!context_.first_reserved_id()) {
        must_recover_ = true;
        is_recovered_ = false;
        return;
    }
    if (now_us < after_failure_.until_us) {
        return;
    }
    const std::optional<store::Mount> mount = store::Mounts(store).Find(mount_id_);
    if (!mount) {
        return;
    }
    try {
        if (Maintain(store, *mount, clock)) {
            after_failure_ = {};
        } else {
            after_failure_.Begin(now_us);
        }
    } catch (const store::StoreError&) {
        throw;
    } catch (const store::LeaseLost&) {
        lease_.NoteLost();
    } catch (const std::exception& failure) {
        after_failure_.Begin(now_us);
        SetStatus(MountState::kFailing, failure.what());
        if (mount->IsShared()) {
            lease_.GiveUp(store);  // the folder may fail on this host alone
        }
    }
}

bool MountMaintenance::Maintain(store::Store& store, const store::Mount& mount, const Clock& clock) {
    std::string failure;
    const std::optional<maintenance::MountFolder> folder = Open(store, mount, failure);
    if (mount.IsShared()) {
        store::SharedMounts(store).SetPresence(mount.id, context_.host, folder.has_value());
    }
    if (!folder) {
        SetStatus(MountState::kNotMounted, failure.empty() ? mount.path : failure);
        must_recover_ = true;  // whatever is mounted later
        // A folder that fails may be well again in a moment, and then has footage of this host whose rows are to come.
        is_recovered_ = mount.IsShared() && (is_recovered_ || failure.empty());
        lease_.NoteLost();
        lock_.Release();
        return failure.empty();
    }
    if (!Acquire(store, mount)) {
        SetStatus(MountState::kInUse, mount.path);
        return true;
    }
    Recover(store, mount, clock);
    const std::int64_t now_us = context_.monotonic_us();
    maintenance::CompleteMarks(store, mount.id, clock.now_s, context_.is_complete);
    const int space_requests = context_.space_requests;
    const bool is_maintained_elsewhere = mount.IsShared() && !lease_.IsHeld();
    if (is_maintained_elsewhere) {
        // The maintaining host sees whether deleting makes room. A host that takes over deletes one recording first.
        disk_watch_ = {maintenance::SpaceWatch(true), maintenance::SpaceWatch(true)};
        is_full_of_kept_ = false;
    } else if (now_us >= next_retention_us_ || std::exchange(seen_space_requests_, space_requests) != space_requests ||
               // Other hosts' recordings fill a shared mount, too, and do not request space here.
               (mount.IsShared() && !disk_watch_.bytes.IsPaused(now_us) && folder->Space().IsShort())) {
        next_retention_us_ = now_us + kRetentionUs;
        EnforceRetention(store, mount, clock);
        is_full_of_kept_ = mount.max_bytes > 0 && store::KeptEvents(store).SizeBytes(mount.id) >= mount.max_bytes;
    }
    if (!recovery_failure_.empty()) {
        SetStatus(MountState::kFailing, recovery_failure_);
    } else if (disk_watch_.IsHeld() && !is_maintained_elsewhere) {
        SetStatus(MountState::kSpaceHeld, mount.path);
    } else if (is_full_of_kept_) {
        SetStatus(MountState::kKeptFull, mount.path);
    } else {
        SetStatus(MountState::kReady, "");
    }
    return true;
}

// A shared mount whose folder fails here counts as not mounted, since other hosts may have it; failure then says why.
std::optional<maintenance::MountFolder> MountMaintenance::Open(store::Store& store, const store::Mount& mount,
                                                               std::string& failure) {
    try {
        return maintenance::OpenMount(store, mount);
    } catch (const std::system_error& error) {
        if (!mount.IsShared()) {
            throw;
        }
        failure = error.what();
        return std::nullopt;
    }
}

// A host whose clock is ahead would delete by age what other hosts have recorded to a shared mount today.
bool MountMaintenance::IsClockInStep(store::Store& store, const store::Mount& mount, const Clock& clock) {
    if (!mount.IsShared()) {
        return true;
    }
    const bool in_step = std::abs(store::SharedMounts(store).ServerTimeS() - clock.now_s) <= kMaxClockDifferenceS;
    const bool has_changed = std::exchange(is_clock_in_step_, in_step) != in_step;
    if (has_changed && in_step) {
        base::LogInfo("mount " + std::to_string(mount.id) + ": maximum ages apply again");
    } else if (has_changed) {
        base::LogWarning("mount " + std::to_string(mount.id) +
                         ": maximum ages wait, because this host's clock is more"
                         " than five minutes off that of the store's server");
    }
    return in_step;
}

void MountMaintenance::EnforceRetention(store::Store& store, const store::Mount& mount, const Clock& clock) {
    maintenance::DeletionResult deleted;
    const auto count = [&](std::uint64_t failures) {
        const std::lock_guard lock(mutex_);
        ++counters_.retention_runs;
        counters_.retention_failures += failures;
        counters_.deleted_events += static_cast<std::uint64_t>(deleted.events);
        counters_.deleted_bytes += static_cast<std::uint64_t>(deleted.bytes);
    };
    try {
        store::FootageRemovals(store).BeginDeletions();
        const auto age_limit = clock.is_trusted && IsClockInStep(store, mount, clock) ? maintenance::AgeLimit::kApplies
                                                                                      : maintenance::AgeLimit::kWaits;
        maintenance::EnforceRetention(store, mount, {clock.now_s, age_limit, context_.monotonic_us()}, context_.host,
                                      disk_watch_, deleted);
    } catch (const store::LeaseLost&) {
        count(0);  // that another host maintains the mount now is no failure
        throw;
    } catch (...) {
        count(1);
        throw;
    }
    count(0);
    if (deleted.events > 0) {
        base::LogInfo("mount " + std::to_string(mount.id) + ": removed " + std::to_string(deleted.events) +
                      " old events");
    }
}

// Locks a mount of one host: false while another recorder has it. Of a shared mount, looks who has the lease: without
// it, only this host's own recordings are recovered here.
bool MountMaintenance::Acquire(store::Store& store, const store::Mount& mount) {
    if (!mount.IsShared()) {
        return lock_.Hold(mount.path);
    }
    lock_.Release();
    lease_.Update(store, context_.monotonic_us());
    must_recover_ |= lease_.ConsumeChange();
    return true;
}

void MountMaintenance::Recover(store::Store& store, const store::Mount& mount, const Clock& clock) {
    const std::int64_t now_us = context_.monotonic_us();
    if (!must_recover_ || now_us < after_recovery_.until_us) {
        return;
    }
    after_recovery_.Begin(now_us);
    try {
        recovery_failure_.clear();
        must_recover_ = !maintenance::Recover(store, mount, context_.first_reserved_id().value_or(0), clock.now_s,
                                              {context_.host, lease_.IsHeld()});
    } catch (const std::system_error& error) {
        recovery_failure_ = error.what();  // one folder that cannot be read must not stop retention
    }
    if (!must_recover_) {
        after_recovery_ = {};
    }
    is_recovered_ = !must_recover_;
}

void MountMaintenance::SetStatus(MountState state, const std::string& reason) {
    const std::lock_guard lock(mutex_);
    const maintenance::MountStatus status{mount_id_, state, reason};
    if (std::exchange(status_, status) == status) {
        return;
    }
    const std::string name = "mount " + std::to_string(mount_id_);
    if (state == MountState::kReady) {
        base::LogInfo(name + " is being maintained again");
    } else {
        base::LogWarning(name +
                         (state == MountState::kFailing     ? " fails: "
                          : state == MountState::kInUse     ? " is used by the recorder of another state folder: "
                          : state == MountState::kSpaceHeld ? " gets no space back from deleted recordings: "
                          : state == MountState::kKeptFull  ? " holds nothing but kept recordings within its limit: "
                                                            : " is not there: ") +
                         reason);
    }
}

}  // namespace lookhaven::recorder
