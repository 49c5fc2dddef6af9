// SPDX-License-Identifier: Apache-2.0
//
// Where an installation's own web server listens, by its configuration.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "standalone/base/installation.h"

namespace lookhaven::doctor {

struct WebListener {
    std::string host;  // by which this machine reaches it: "127.0.0.1" or "::1"
    std::string port;
    bool has_tls = false;
};

// Who starts the web server puts it there; an installation behind another web server has none.
std::filesystem::path WebServerConfiguration(const base::Installation& installation);

// Empty without a configuration.
std::vector<WebListener> WebListenersOf(const base::Installation& installation);

}  // namespace lookhaven::doctor
