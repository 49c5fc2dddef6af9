// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Event: report what happened at a camera, list it, take its footage along. Runs in a request
// process.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"
#include "standalone/webapi/scgi.h"

namespace lookhaven::webapi {

constexpr const char* kEventApi = "VEXO.Event";

// The whole answer; empty when it went to standard output already. The caller of the context must be known. Throws
// Failure for what the caller did wrong or cannot have: 400, 403, 404, 405.
std::string ServeEvent(binding::RequestContext& context, const ScgiRequest& request, int version,
                       const std::string& method, const Parameters& parameters);

}  // namespace lookhaven::webapi
