// SPDX-License-Identifier: Apache-2.0
//
// The web server's part in showing cameras of recording servers: where each is, and the certificate it must show.
#pragma once

#include <vector>

#include "standalone/base/installation.h"
#include "standalone/store/servers.h"

namespace lookhaven::cli {

// Writes the configuration and the certificates anew, and has a web server that runs take them. Throws std::system_error,
// Failure.
void WriteRelayConfig(const base::Installation& installation, const std::vector<store::RecordingServer>& servers);

}  // namespace lookhaven::cli
