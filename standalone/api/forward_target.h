// SPDX-License-Identifier: Apache-2.0
//
// Forwards the calls that another host of the same store has to answer: for a camera's picture to the host that records
// it, for footage to one that can read its mount, for a player to the one where it runs.
//
// Why so        Sessions, rights, searches and settings come from the store, so every host answers them. Rings and
//               files are one host's alone.
#pragma once

#include <string>

#include "standalone/api/call.h"
#include "standalone/api/forward.h"

namespace lookhaven::api {

// The host that a call needs, for what it has alone.
struct ForwardTarget {
    int host_id = 0;  // 0: any
    Forwarded kind = Forwarded::kFootage;
    std::string what;  // that the host has, for an error message: as in Forward
};

// The host that records the camera, else the one that is configured to; 0 where that is nobody.
int HostOfCamera(store::Store& records, int camera_id);

// False where this host answers the call itself, also where the caller may not have what it asks for: the refusal is
// the same everywhere. True when another host has answered it on standard output. Only for an admitted call. Throws
// Failure: 503 where that host is offline, the call was forwarded to the wrong one, or no host has a shared mount; 409
// where parts of what is to be exported lie on several hosts.
bool ForwardIfNeeded(const Call& call);

}  // namespace lookhaven::api
