// SPDX-License-Identifier: Apache-2.0
//
// Sends what a plan of an export says.
#pragma once

#include <functional>
#include <string_view>

#include "standalone/evidence/plan.h"
#include "standalone/evidence/signature_library.h"

namespace lookhaven::evidence {

// Signs the manifest of an archive, whose text it is given; called once all footage has been read.
using Signer = std::function<Signature(std::string_view manifest)>;

// Exactly plan.size_bytes, or it throws: media::SourceError, std::system_error with the sink's errno, and what the
// signer throws. What cannot be read any more is left out, which the manifest of an archive tells; a file without
// manifest then throws. Keeps at most a second of footage in memory.
void Write(const Plan& plan, const media::RemuxLibrary& remux, const media::ByteSink& sink, const Signer& sign);

}  // namespace lookhaven::evidence
