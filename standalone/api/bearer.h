// SPDX-License-Identifier: Apache-2.0
//
// The access token that a request carries as "Authorization: Bearer <token>", in place of a session.
#pragma once

#include <optional>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The live token of the request, noted as in use; nothing where it carries none. What does not begin as access tokens
// do is none, but that of the monitoring, or of a web server in front. Throws Failure 401 for one that is unknown,
// removed or expired, 429 after too many of those from the caller's network; store::StoreError.
std::optional<store::AccessToken> FindAccessToken(const Call& call);

// A token reports marks and does nothing else. Throws Failure 403 for any other call, whether there is such a method or
// not.
void RequireReport(const Call& call);

}  // namespace lookhaven::api
