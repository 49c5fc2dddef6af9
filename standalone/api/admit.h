// SPDX-License-Identifier: Apache-2.0
//
// Who a call comes from, and whether it may go on.
#pragma once

#include <cstddef>
#include <optional>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The name of the cookie that carries the session's secret. Over HTTPS it is one that a browser takes from this very host
// alone, never from another that shares its domain, nor over plain HTTP.
const char* SessionCookie(const http::Request& request);

// The live session of the call's cookie, noted as in use; nothing when there is none. Looks at query and headers only.
// Throws Failure 403 for a request that another site's page made a browser send, but for a GET of the API that
// authenticates its callers itself, which has no session then. Throws store::StoreError.
std::optional<binding::Login> FindLogin(const Call& call);

// Makes the call's login the caller of this process, and narrows its rights by "privData". Throws Failure
// 401 without a session, except at the API that authenticates its callers itself; 503 when max_requests of the session
// run already.
void Admit(const Call& call, std::size_t max_requests);

}  // namespace lookhaven::api
