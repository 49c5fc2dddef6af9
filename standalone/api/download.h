// SPDX-License-Identifier: Apache-2.0
//
// Sends the footage of an event as a file to keep.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The method Download of VEXO.Event: writes the whole answer to standard output, without sound where the caller may not
// hear the camera. Throws Failure 400; 404 as RequireFootage and OpenFootage do; 500 when the footage cannot be read.
std::string Download(const Call& call);

}  // namespace lookhaven::api
