// SPDX-License-Identifier: Apache-2.0
//
// Asks the web API of a host that this one is paired with.
#pragma once

#include <string>

#include "standalone/store/servers.h"

namespace lookhaven::cli {

// The body of the answer, at most 1 MiB, which is another host's word. Takes ten seconds at most, and the time to
// resolve its name. secret: of both hosts. Throws Failure kUnavailable when the host cannot be reached, shows another
// certificate than its own, or refuses.
std::string AskPeer(const store::RecordingServer& server, const std::string& secret, const std::string& query);

}  // namespace lookhaven::cli
