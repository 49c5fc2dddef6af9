// SPDX-License-Identifier: Apache-2.0
//
// Who a call comes from, and whether it may go on.
#pragma once

#include <cstddef>
#include <optional>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The name of the cookie that carries the session's secret. Over HTTPS it is one that a browser takes from this very
// host alone, never from another that shares its domain, nor over plain HTTP.
const char* SessionCookie(const http::Request& request);

// The live session of the call's cookie, noted as in use; nothing when there is none. Looks at query and headers only.
// Throws Failure 403 for a request that another site's page made a browser send, but for a GET of the API that
// authenticates its callers itself, which has no session then. Throws store::StoreError.
std::optional<binding::Login> FindLogin(const Call& call);

// How many admitted requests run at once.
struct RequestLimits {
    std::size_t without_managers = 256;  // of all callers but managers
    std::size_t per_user = 64;           // paired hosts are one user together, a host of the store is one
    std::size_t searches_per_user = 4;
};

// What serving a call takes.
enum class CostClass {
    kLittle,
    kPictures,  // the memory of rings and decoders; mostly waits for a camera
    kSearch,    // seconds of a processor, perhaps
};
CostClass CostClassOf(const Call& call);

// Makes the call's login the caller of this process, and narrows its rights by "privData"; with an access token, nobody
// is the caller, who has no rights but the token's. Throws Failure 401 without
// a session, except at the API that authenticates its callers itself; 503 beyond a limit. Of the searches of a user,
// those beyond the limit wait, ten seconds at most.
void Admit(const Call& call, const RequestLimits& limits);

// Counts the request as one of the paired hosts. Throws Failure 503 beyond a limit.
void AdmitPairedHost(control::SlotTable& slots, control::Slot& slot, const RequestLimits& limits);

// The same, as one of that host of the store.
void AdmitHost(control::SlotTable& slots, control::Slot& slot, int host, const RequestLimits& limits);

}  // namespace lookhaven::api
