// SPDX-License-Identifier: Apache-2.0
//
// The state of the installation, part by part, and what to do about a fault: what lookhaven doctor reports, for a page.
//
// Why so        The checks read all of the store, look at disks that may hang, and ask other hosts. A request must be
//               answered within seconds all the same, so each check runs in a process of its own and is given up when
//               it takes too long.
#pragma once

#include <json/json.h>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Takes twelve seconds at most, but for what it waits for the store. Closes the call's store. Throws store::StoreError.
Json::Value SystemStatus(const Call& call);

}  // namespace lookhaven::api
