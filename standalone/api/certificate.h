// SPDX-License-Identifier: Apache-2.0
//
// SetCertificate of VEXO.System.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

std::string SetCertificate(const Call& call);

}  // namespace lookhaven::api
