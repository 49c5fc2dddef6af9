// SPDX-License-Identifier: Apache-2.0
//
// Has the installation's own web server read its changed files.
#pragma once

#include <stdexcept>
#include <string>

#include "standalone/base/installation.h"

namespace lookhaven::admin {

// The web server continues with the certificate that it had.
class WebServerRefused : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// Has the web server reload its certificate, and waits until it shows the one of that fingerprint; its connections
// stay. False where none runs: one that is started later reads it then. Throws WebServerRefused when another one
// is still shown after ten seconds, or that cannot be seen.
bool ReloadWebServer(const base::Installation& installation, const std::string& fingerprint);

}  // namespace lookhaven::admin
