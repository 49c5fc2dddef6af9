// SPDX-License-Identifier: Apache-2.0
//
// The configuration by which nginx forwards streams from recording servers: where each is, and the certificate it must
// present.
#pragma once

#include <vector>

#include "standalone/base/installation.h"
#include "standalone/store/servers.h"

namespace lookhaven::cli {

// Rewrites the configuration and the certificates, and reloads nginx if it runs. Throws std::system_error, and Failure
// for a certificate without a host name.
void WriteRelayConfig(const base::Installation& installation, const std::vector<store::RecordingServer>& servers);

}  // namespace lookhaven::cli
