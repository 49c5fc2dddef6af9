// SPDX-License-Identifier: Apache-2.0
//
// LogLevels and SetLogLevels of VEXO.System.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

std::string LogLevels(const Call& call);
std::string SetLogLevels(const Call& call);

}  // namespace lookhaven::api
