// SPDX-License-Identifier: Apache-2.0
//
// Sends the footage of an event as a file to keep.
#pragma once

#include <optional>

#include "standalone/api/call.h"
#include "standalone/store/marks.h"

namespace lookhaven::api {

// Writes the whole answer to standard output, without sound where the caller may not hear the camera. kind: nothing for
// a recorded event. Throws Failure 404 when there is no such event, it has no footage, or the caller may not see it;
// 500 when the footage cannot be read.
void Download(const Call& call, std::optional<store::MarkKind> kind, int event);

}  // namespace lookhaven::api
