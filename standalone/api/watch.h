// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event Watch: what is being reported, told as it is, until the client or its session goes.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Sends the stream, and returns an empty answer when it has ended. Throws Failure 400 for a place that is none, 503
// where the caller has too many watches.
std::string Watch(const Call& call);

}  // namespace lookhaven::api
