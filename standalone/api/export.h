// SPDX-License-Identifier: Apache-2.0
//
// Sends a span of several cameras as a file to keep.
#pragma once

#include <set>
#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The methods PlanExport and Export of VEXO.Event: what the file would hold, and the file itself, which goes to
// standard output. Without sound where the caller may not hear a camera. Throw Failure 400; 404 for a camera that is
// not there or that the caller may not play back, and where nothing was recorded; 429 and 503 while as many exports of
// the account, or in all, are running as may; 500 when footage cannot be read.
std::string PlanExport(const Call& call);
std::string Export(const Call& call);

// The mounts on which lies what is asked for; none where the caller may not have all of it. Throws Failure 400.
std::set<int> MountsOfExport(const Call& call);

}  // namespace lookhaven::api
