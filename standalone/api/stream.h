// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event Stream: recorded H.264 or H.265 with its sound, as it was recorded.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Sends the stream, and returns an empty answer when it has ended. Throws Failure 400 for parameters; 404 as
// RequestedFootage, OpenFootage and RequestedFrame do; 406 for footage in a codec that is not streamed, or not named by
// the client; 500 when the footage cannot be read.
std::string Stream(const Call& call);

}  // namespace lookhaven::api
