// SPDX-License-Identifier: Apache-2.0
//
// Reports the hosts that share the store, as this host's recorder sees them, to the operator: the file "hosts" in the
// run folder, one line per host, replaced as a whole when something changes:
//
//   2 away 12
//   <host> <here|there|away> <cameras whose lease it has>
//
// Why so        Whether a heartbeat stands still can only be told by who watches it for a while.
#pragma once

#include <vector>

#include "standalone/base/installation.h"

namespace lookhaven::maintenance {

enum class HostState {
    kHere,   // this one
    kThere,  // its recorder runs and reaches the store
    kAway,   // it does not, and has not for a while
};

const char* NameOf(HostState state);  // "here", "there", "away"

struct HostStatus {
    int host = 0;
    HostState state = HostState::kThere;
    int cameras = 0;

    bool operator==(const HostStatus&) const = default;
};

// Throws std::system_error.
void WriteHostStatus(const base::Installation& installation, const std::vector<HostStatus>& hosts);

// As ReadRecordingStatus: a recorder that has ended leaves its last report behind.
std::vector<HostStatus> ReadHostStatus(const base::Installation& installation);

}  // namespace lookhaven::maintenance
