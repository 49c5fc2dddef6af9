// SPDX-License-Identifier: Apache-2.0
//
// Reports the hosts that share the store, as this host's recorder sees them, to the operator: the file "hosts" in the
// run folder, one line per host, replaced as a whole when something changes:
//
//   2 offline 12
//   <host> <local|online|offline> <cameras whose lease it has>
//
// Why so        Only a process that watches a heartbeat for a while can tell whether it still changes.
#pragma once

#include <set>
#include <vector>

#include "standalone/base/installation.h"

namespace lookhaven::maintenance {

enum class HostState {
    kLocal,    // this one
    kOnline,   // its recorder runs and reaches the store
    kOffline,  // it does not, and has not for a while
};

const char* NameOf(HostState state);  // "local", "online", "offline"

struct HostStatus {
    int host = 0;
    HostState state = HostState::kOnline;
    int cameras = 0;

    bool operator==(const HostStatus&) const = default;
};

// Throws std::system_error.
void WriteHostStatus(const base::Installation& installation, const std::vector<HostStatus>& hosts);

// As ReadCameraStatus: a recorder that has ended leaves its last report behind.
std::vector<HostStatus> ReadHostStatus(const base::Installation& installation);

// The ids of those that the same report calls offline, and of all others in it. A host that it does not name is in
// neither: nobody has watched its heartbeat yet, so nothing may rely on it.
std::set<int> OfflineHosts(const base::Installation& installation);
std::set<int> OnlineHosts(const base::Installation& installation);

}  // namespace lookhaven::maintenance
