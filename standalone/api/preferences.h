// SPDX-License-Identifier: Apache-2.0
//
// Preferences and SetPreferences of VEXO.User: every account's own.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

std::string Preferences(const Call& call);

// Throws Failure 403 where the call names another account than the caller's: a page that is still open after somebody
// else has logged in in the same browser must not change what that one prefers.
std::string SetPreferences(const Call& call);

}  // namespace lookhaven::api
