// SPDX-License-Identifier: Apache-2.0
//
// The name under which an installation's recorder holds its role in the store (store/recorder_lease.h).
#pragma once

#include <string>

#include "standalone/base/installation.h"

namespace lookhaven::maintenance {

// "/var/lib/lookhaven on nvr1": the same after a restart, another on each host.
std::string RecorderName(const base::Installation& installation);

}  // namespace lookhaven::maintenance
