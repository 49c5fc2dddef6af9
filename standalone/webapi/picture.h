// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Picture: one JPEG of a camera, whatever codec it sends. Runs in a request process.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"

namespace lookhaven::webapi {

constexpr const char* kPictureApi = "VEXO.Picture";

// The whole answer. The caller of the context must be known. Throws Failure for what the caller did wrong or cannot
// have: 400, 403, 404, 504.
std::string ServePicture(const binding::RequestContext& context, int version, const std::string& method,
                         const Parameters& parameters);

}  // namespace lookhaven::webapi
