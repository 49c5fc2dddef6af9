// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recorder_role.h"

#include <utility>

#include "standalone/base/log.h"

namespace lookhaven::recorder {

bool RecorderRole::Hold(store::Store& store, int first_own_id) {
    const std::int64_t now_us = monotonic_us_();
    if (held_count_ && now_us - changed_us_ < kRenewUs && first_own_id == told_first_own_id_) {
        return true;
    }
    store::RecorderLease lease(store);
    const store::RecorderRole role = lease.Current();
    if (MayTake(role, now_us) && lease.Take(role.count, name_, first_own_id)) {
        if (!held_count_ && !role.holder.empty() && role.holder != name_) {
            base::LogWarning("records in the place of " + role.holder + ", which has stopped");
        }
        held_count_ = role.count + 1;
        changed_us_ = now_us;
        told_first_own_id_ = first_own_id;
        was_held_ = true;
    } else if (std::exchange(held_count_, std::nullopt)) {
        base::LogError("stops recording: " + role.holder + " records the cameras of this store now");
    }
    return held_count_.has_value();
}

bool RecorderRole::MayTake(const store::RecorderRole& role, std::int64_t now_us) {
    if (held_count_) {
        // A store that lost its last second, as after a crash of its server, has an older count of ours.
        return role.count == *held_count_ || (role.holder == name_ && role.count < *held_count_);
    }
    // Under our name it is an earlier process of ours, unless we have lost the role to it.
    if (role.holder.empty() || (role.holder == name_ && !was_held_)) {
        return true;
    }
    if (seen_count_ != role.count) {
        if (!std::exchange(seen_count_, role.count)) {
            base::LogWarning("does not record: " + role.holder + " records the cameras of this store");
        }
        changed_us_ = now_us;
    }
    return now_us - changed_us_ >= kExpiryUs;
}

}  // namespace lookhaven::recorder
