// SPDX-License-Identifier: Apache-2.0
//
// Which host can read the footage that a call asks for: its mount's host, of a shared mount any that has the folder.
#pragma once

#include <optional>
#include <string>

#include "standalone/api/call.h"
#include "standalone/api/footage.h"
#include "standalone/api/forward.h"

namespace lookhaven::api {

// What a call needs that not every host has.
struct Place {
    int host_id = 0;  // 0: any
    Forwarded kind = Forwarded::kFootage;
    std::string what;
};

// Any host for what is not there, or not the caller's to have. Throws Failure 503 for footage on a shared mount that no
// host has.
Place PlaceOfFootage(const Call& call, const std::optional<Footage>& footage, int own_host);

// The one host that makes the file of an export: of all that is asked for. Throws Failure 409 where the footage lies on
// several hosts, 503 where no host has what it needs of shared mounts.
Place PlaceOfExport(const Call& call, int own_host);

}  // namespace lookhaven::api
