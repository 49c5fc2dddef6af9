// SPDX-License-Identifier: Apache-2.0
//
// Keeps footage beyond its mount's limits, or gives it back to retention.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The method Keep of VEXO.Event, for managers. Throws Failure 400, 403, 404.
std::string Keep(const Call& call);

}  // namespace lookhaven::api
