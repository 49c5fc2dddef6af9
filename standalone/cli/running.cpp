// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/running.h"

#include <chrono>
#include <string>
#include <thread>

#include "standalone/cli/console.h"
#include "standalone/control/common_config.h"
#include "standalone/doctor/host_answers.h"
#include "standalone/store/recorder_lease.h"

namespace lookhaven::cli {

namespace {

// A recorder renews its lease every five seconds, later where its store is slow.
constexpr std::chrono::milliseconds kLeaseTimeout{12'000};
constexpr std::chrono::milliseconds kLeasePollInterval{500};
// What a recorder last said of itself counts for five seconds, also when it has ended since.
constexpr std::chrono::milliseconds kHeartbeatTimeout{7'000};
constexpr std::chrono::milliseconds kHeartbeatPollInterval{100};

void WaitWhileItCountsAsRunning(const base::Installation& installation) {
    for (auto waited = std::chrono::milliseconds(0); waited < kHeartbeatTimeout; waited += kHeartbeatPollInterval) {
        if (control::RecorderProcess(installation) ||
            control::FindRecorder(installation) == control::RecorderState::kNone) {
            return;
        }
        std::this_thread::sleep_for(kHeartbeatPollInterval);
    }
}

}  // namespace

void RequireStopped(const base::Installation& installation) {
    WaitWhileItCountsAsRunning(installation);
    if (control::FindRecorder(installation) != control::RecorderState::kNone || doctor::HostAnswers(installation)) {
        throw Failure(kUnavailable, "Lookhaven is running for ", installation.Home().string(),
                      ": stop it first (installed services: as root, systemctl stop lookhaven.target)");
    }
}

void RequireNoOtherRecorder(const base::Installation& installation, store::Store& store) {
    store::RecorderLease lease(store, installation.HostId());
    const store::LeaseState before = lease.Current();
    if (before.holder.empty() || before.holder == store::RecorderName(installation)) {
        return;
    }
    for (auto waited = kLeasePollInterval; waited <= kLeaseTimeout; waited += kLeasePollInterval) {
        std::this_thread::sleep_for(kLeasePollInterval);
        if (lease.Current().count != before.count) {
            throw Failure(kUnavailable, "the recorder of ", before.holder, " records into this store: stop it first");
        }
    }
}

}  // namespace lookhaven::cli
