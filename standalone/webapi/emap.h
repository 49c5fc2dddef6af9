// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Emap: what an editor of e-maps needs, and the states of doors and ports. Runs in a request
// process.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"
#include "standalone/webapi/scgi.h"

namespace lookhaven::webapi {

constexpr const char* kEmapApi = "VEXO.Emap";

// The whole answer. The caller of the context must be known. Throws Failure for what the caller did wrong or cannot have:
// 400, 403, 404, 405, 409.
std::string ServeEmap(binding::RequestContext& context, const ScgiRequest& request, int version,
                      const std::string& method, const Parameters& parameters);

}  // namespace lookhaven::webapi
