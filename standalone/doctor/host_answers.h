// SPDX-License-Identifier: Apache-2.0
//
// Whether the web API host does its work.
#pragma once

#include "standalone/base/installation.h"

namespace lookhaven::doctor {

// Any answer shows that the host accepts connections, forks and responds. Waits three seconds for one.
bool HostAnswers(const base::Installation& installation);

}  // namespace lookhaven::doctor
