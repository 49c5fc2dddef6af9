// SPDX-License-Identifier: Apache-2.0
//
// Sessions and EndSessions of VEXO.User: of the caller's own account, or for managers of any.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Each throws Failure 403 for another account unless the caller is a manager, whether or not it exists.
std::string Sessions(const Call& call);
std::string EndSessions(const Call& call);

}  // namespace lookhaven::api
