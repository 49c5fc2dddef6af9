// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Relay: the live view of a recording server's camera on this host's origin. Runs in a request
// process.
//
// Why so        A browser has no login at the other server. This host looks whether the caller may see the camera, and tells
//               the web server to fetch it with a token that is good for minutes; secret and token never reach the browser.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"

namespace lookhaven::webapi {

constexpr const char* kRelayApi = "VEXO.Relay";

// A head that sends the web server to the other server. The caller of the context must be known. Throws Failure 400, 403,
// 404, or 502 when the server's name has no address.
std::string ServeRelay(binding::RequestContext& context, int version, const std::string& method,
                       const Parameters& parameters);

}  // namespace lookhaven::webapi
