// SPDX-License-Identifier: Apache-2.0
//
// Sends what a plan of an export says.
#pragma once

#include "standalone/evidence/plan.h"

namespace lookhaven::evidence {

// Exactly plan.size_bytes, or it throws: media::SourceError, std::system_error with the sink's errno. What cannot be
// read any more is left out, which the manifest of an archive tells; a file without manifest then throws. Keeps at
// most a second of footage in memory.
void Write(const Plan& plan, const media::RemuxLibrary& remux, const media::ByteSink& sink);

}  // namespace lookhaven::evidence
