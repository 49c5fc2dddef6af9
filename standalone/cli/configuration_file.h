// SPDX-License-Identifier: Apache-2.0
//
// The file of settings of the installed services, which systemd reads as their environment.
#pragma once

#include <string>

namespace lookhaven::cli {

constexpr const char* kSettingsFile = "/etc/lookhaven/lookhaven.conf";

// Throws Failure kConfigError, which names the line, for a key that is none and for a value that its key cannot have. A
// missing file is as good as an empty one.
void CheckSettingsFile(const std::string& path);

}  // namespace lookhaven::cli
