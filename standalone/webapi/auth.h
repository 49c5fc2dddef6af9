// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Auth: log in, log out, who am I. Runs in a request process.
#pragma once

#include <map>
#include <optional>
#include <string>

#include "standalone/binding/request.h"
#include "standalone/binding/request_context.h"
#include "standalone/webapi/parameters.h"
#include "standalone/webapi/scgi.h"
#include "standalone/webapi/slot_table.h"

namespace lookhaven::webapi {

constexpr const char* kAuthApi = "VEXO.Auth";

// The live session of the request's cookie, noted as in use; nothing when there is none. Throws store::StoreError.
std::optional<binding::Login> FindLogin(binding::RequestContext& context,
                                        const std::map<std::string, std::string>& cookies);

// The whole answer. Throws Failure for what the caller did wrong: 401, 404, 405, 429.
std::string ServeAuth(binding::RequestContext& context, SlotTable& slots, const ScgiRequest& request, int version,
                      const std::string& method, const Parameters& parameters);

}  // namespace lookhaven::webapi
