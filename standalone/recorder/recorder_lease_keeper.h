// SPDX-License-Identifier: Apache-2.0
//
// Holds the recorder lease of the store, or of this host, for this process (store/recorder_lease.h).
//
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "standalone/store/recorder_lease.h"

namespace lookhaven::recorder {

// How often a lease is renewed, and how long its count stands still until another recorder takes it.
struct LeaseTimes {
    std::int64_t renew_us = 5'000'000;
    std::int64_t expiry_us = 20'000'000;
};

class RecorderLeaseKeeper {
  public:
    // name: of this installation on this machine. Nobody else with that name runs, so its lease is taken over at once.
    // host: the id of this machine among the hosts of the store; 0 where it is none of them.
    RecorderLeaseKeeper(std::string name, std::function<std::int64_t()> monotonic_us, int host = 0,
                        LeaseTimes times = {})
        : name_(std::move(name)),
          monotonic_us_(std::move(monotonic_us)),
          host_(host),
          times_(times) {}

    // Renews or takes the lease when that is due; whether this process has it. first_reserved_id as in RecorderLease.
    // While the store is unreachable the lease stays. Throws store::StoreError.
    bool Hold(store::Store& store, int first_reserved_id);
    // Gives the lease back if this process has it: at a clean stop, when all rows are stored. Throws store::StoreError.
    void Release(store::Store& store);

  private:
    bool IsRefused(store::Store& store);
    std::string Place() const { return host_ == 0 ? "store" : "host"; }
    bool MayTake(const store::LeaseState& state, std::int64_t now_us);

    const std::string name_;
    const std::function<std::int64_t()> monotonic_us_;
    const int host_;
    const LeaseTimes times_;
    std::string told_refusal_;
    std::optional<std::int64_t> held_count_;  // nothing while the lease is not ours
    std::optional<std::int64_t> seen_count_;  // somebody else's
    std::int64_t changed_us_ = 0;             // when it was seen to change, or ours was renewed
    bool was_held_ = false;
    int told_first_reserved_id_ = 0;
};

}  // namespace lookhaven::recorder
