// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recorder_lease_keeper.h"

#include <utility>

#include "standalone/base/log.h"
#include "standalone/store/hosts.h"

namespace lookhaven::recorder {

bool RecorderLeaseKeeper::Hold(store::Store& store, int first_reserved_id) {
    const std::int64_t now_us = monotonic_us_();
    if (held_count_ && now_us - changed_us_ < times_.renew_us && first_reserved_id == told_first_reserved_id_) {
        return true;
    }
    if (IsRefused(store)) {
        held_count_.reset();
        return false;
    }
    store::RecorderLease lease(store, host_);
    const store::LeaseState state = lease.Current();
    if (MayTake(state, now_us) && lease.Take(state.count, name_, first_reserved_id)) {
        if (!held_count_ && !state.holder.empty() && state.holder != name_) {
            base::LogWarning("records in the place of " + state.holder + ", which has stopped");
        }
        held_count_ = state.count + 1;
        changed_us_ = now_us;
        told_first_reserved_id_ = first_reserved_id;
        was_held_ = true;
    } else if (std::exchange(held_count_, std::nullopt)) {
        base::LogError("stops recording: " + state.holder + " records the cameras of this " + Place() + " now");
    }
    return held_count_.has_value();
}

void RecorderLeaseKeeper::Release(store::Store& store) {
    if (held_count_) {
        store::RecorderLease(store, host_).Release(*held_count_, name_);
        held_count_.reset();
    }
}

// On a store with hosts, a machine that is none of them would record their cameras a second time.
bool RecorderLeaseKeeper::IsRefused(store::Store& store) {
    store::Hosts hosts(store);
    std::string refusal;
    if (host_ != 0 && !hosts.Find(host_)) {
        refusal = "this machine is no host of this store any more: add it with lookhaven host add";
    } else if (host_ == 0 && !hosts.All().empty()) {
        refusal = "hosts share this store, and this machine is not one of them: add it with lookhaven host add";
    }
    if (std::exchange(told_refusal_, refusal) != refusal && !refusal.empty()) {
        base::LogError("does not record: " + refusal);
    }
    return !refusal.empty();
}

bool RecorderLeaseKeeper::MayTake(const store::LeaseState& state, std::int64_t now_us) {
    if (held_count_) {
        // A store that lost its last second, as after a crash of its server, has an older count of ours.
        return state.count == *held_count_ || (state.holder == name_ && state.count < *held_count_);
    }
    // Under our name it is an earlier process of ours, unless we have lost the lease to it.
    if (state.holder.empty() || (state.holder == name_ && !was_held_)) {
        return true;
    }
    if (seen_count_ != state.count) {
        if (!std::exchange(seen_count_, state.count)) {
            base::LogWarning("does not record: " + state.holder + " records the cameras of this " + Place());
        }
        changed_us_ = now_us;
    }
    return now_us - changed_us_ >= times_.expiry_us;
}

}  // namespace lookhaven::recorder
