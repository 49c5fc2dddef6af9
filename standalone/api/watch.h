// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event Watch: sends alerts and POS transactions as they are reported, until the client or its session ends.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Sends the stream, and returns an empty answer when it has ended. Throws Failure 400 for a place that is none, 503
// where the caller has too many watches.
std::string Watch(const Call& call);

}  // namespace lookhaven::api
