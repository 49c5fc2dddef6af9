// SPDX-License-Identifier: Apache-2.0
//
// Asks the hosts whose cameras this one shows for the list of them.
#pragma once

#include <string>
#include <vector>

#include "standalone/store/servers.h"

namespace lookhaven::remote {

struct PairedHostAnswer {
    store::RecordingServer server;
    std::vector<store::RemoteCamera> cameras;
    std::string failure;  // why there are none: whether port, certificate, clock or secret; empty when they came
};

// secret: that of both hosts. Takes ten seconds at most.
PairedHostAnswer AskPairedHost(const store::RecordingServer& server, const std::string& secret);

// All enabled hosts with an address, at once, so that one that fails or is slow keeps no other from being asked.
std::vector<PairedHostAnswer> AskPairedHosts(store::Store& store);

}  // namespace lookhaven::remote
