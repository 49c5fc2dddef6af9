// SPDX-License-Identifier: Apache-2.0
//
// Which host can read the footage that a call asks for: its mount's host, of a shared mount any that has the folder.
#pragma once

#include <optional>

#include "standalone/api/call.h"
#include "standalone/api/footage.h"
#include "standalone/api/forward_target.h"

namespace lookhaven::api {

// Any host for what is not there, or not the caller's to have. Throws Failure 503 for footage on a shared mount that no
// host has.
ForwardTarget TargetOfFootage(const Call& call, const std::optional<Footage>& footage, int own_host);

// The one host that makes the file of an export: of all that is asked for. Throws Failure 409 where the footage lies on
// several hosts, 503 where no host has what it needs of shared mounts.
ForwardTarget TargetOfExport(const Call& call, int own_host);

}  // namespace lookhaven::api
