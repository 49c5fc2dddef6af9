// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/recorder_name.h"

#include <array>

#include <unistd.h>

namespace lookhaven::maintenance {

std::string RecorderName(const base::Installation& installation) {
    std::array<char, 256> host{};
    ::gethostname(host.data(), host.size() - 1);
    return installation.Home().string() + " on " + host.data();
}

}  // namespace lookhaven::maintenance
