// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_recovery.h"

#include <algorithm>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/maintenance/deletion.h"
#include "standalone/maintenance/inspection.h"
#include "standalone/maintenance/recording_recovery.h"
#include "standalone/store/hosts.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::int64_t kDayS = 86'400;
constexpr std::int64_t kRenewUs = 1'000'000;

// What is wrong with one file must not keep the others from being recovered, unless it is the disk that fails. False
// when something was.
template <class Work>
bool Try(Work&& work) {
    try {
        if (const std::string done = work(); !done.empty()) {
            base::LogInfo(done);
        }
        return true;
    } catch (const store::StoreError&) {
        throw;
    } catch (const std::exception& failure) {
        if (IsDiskFailure(failure)) {
            throw;
        }
        base::LogWarning(std::string("cannot recover a recording: ") + failure.what());
        return false;
    }
}

// Which recordings are recovered here.
class RecoveryScope {
  public:
    RecoveryScope(store::Store& store, const store::Mount& mount, int first_reserved_id, const MountRole& role)
        : is_shared_(mount.IsShared()),
          first_reserved_id_(first_reserved_id),
          role_(role) {
        if (is_shared_) {
            blocks_ = store::Events(store).ReservedBlocks();
            for (const store::Host& host : store::Hosts(store).All()) {
                existing_hosts_.insert(host.id);
            }
        }
    }

    bool Covers(const store::Event& row) const { return CoversIdOf(row.host_id, row.id); }

    // On a shared mount only ids whose host is known: a file without a row may belong to a host that is offline.
    bool Covers(const archive::FileName& file) const {
        if (!is_shared_) {
            return file.event < first_reserved_id_;
        }
        const auto block = std::ranges::find_if(blocks_, [&](const auto& each) { return each.Has(file.event); });
        return block != blocks_.end() && CoversIdOf(block->host_id, file.event);
    }

  private:
    bool CoversIdOf(int host, int event) const {
        if (!is_shared_ || host == role_.host) {
            return event < first_reserved_id_;
        }
        return role_.is_maintainer && !existing_hosts_.contains(host);
    }

    const bool is_shared_;
    const int first_reserved_id_;
    const MountRole role_;
    std::vector<store::EventIdBlock> blocks_;
    std::set<int> existing_hosts_;
};

// Keeps the lease of a mount while a long recovery goes on.
class LeaseRenewal {
  public:
    LeaseRenewal(store::Store& store, const store::Mount& mount, const MountRole& role)
        : shared_(store),
          mount_id_(mount.id),
          host_(mount.IsShared() && role.is_maintainer ? role.host : 0) {}

    void Tick() {
        const std::int64_t now_us = base::MonotonicMicros();
        if (host_ != 0 && now_us - renewed_us_ >= kRenewUs) {
            renewed_us_ = now_us;
            shared_.Renew(mount_id_, host_);
        }
    }

  private:
    store::SharedMounts shared_;
    const int mount_id_;
    const int host_;  // 0: there is no lease to keep
    std::int64_t renewed_us_ = base::MonotonicMicros();
};

bool ImportRecent(store::Events& events, const MountFolder& mount, int mount_id, const RecoveryScope& scope,
                  LeaseRenewal& lease, std::int64_t now_s) {
    bool is_complete = true;
    for (const MountFolder::File& file : mount.Files(now_s - kDayS)) {
        lease.Tick();
        if (file.name.kind == archive::FileKind::kRecording && scope.Covers(file.name) &&
            !IsRowOf(events.Find(file.name.event), file.name)) {
            is_complete &= Try([&] {
                const int new_id = events.NextId();
                return ImportRecording(events, mount, mount_id, file.name, new_id, new_id + 1);
            });
        }
    }
    return is_complete;
}

}  // namespace

bool Recover(store::Store& store, const store::Mount& mount, int first_reserved_id, std::int64_t now_s,
             const MountRole& role) {
    const std::optional<MountFolder> folder = OpenMount(store, mount);
    if (!folder) {
        return false;
    }
    if (!mount.IsShared() || role.is_maintainer) {
        Deletion(store, mount, *folder, now_s, role.host).Finish();
    }
    store::Mounts(store).ReserveIds(folder->LastCamera(), 0);
    bool is_complete = true;
    store::Events events(store);
    events.SetMissingOrders(mount.id);
    const RecoveryScope scope(store, mount, first_reserved_id, role);
    LeaseRenewal lease(store, mount, role);
    for (const store::Event& row : events.Open()) {
        lease.Tick();
        if (row.mount_id == mount.id && scope.Covers(row) && !row.demo) {
            is_complete &= Try([&] { return CloseEvent(events, *folder, row); });
        }
    }
    return ImportRecent(events, *folder, mount.id, scope, lease, now_s) && is_complete;
}

}  // namespace lookhaven::maintenance
