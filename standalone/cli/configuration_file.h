// SPDX-License-Identifier: Apache-2.0
//
// The configuration file of the installed services, which systemd reads as their environment.
#pragma once

#include <string>

namespace lookhaven::cli {

constexpr const char* kConfigurationFile = "/etc/lookhaven/lookhaven.conf";

// Throws Failure kConfigError, which names the line, for an unknown key and for a value that its key cannot have. A
// missing file counts as an empty one.
void CheckConfigurationFile(const std::string& path);

}  // namespace lookhaven::cli
