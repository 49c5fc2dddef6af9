// SPDX-License-Identifier: Apache-2.0
//
// Forwards a call to another host of the same store, and that host's answer to the client.
//
// Why so        Both hosts have the same accounts, sessions and rights. So the call carries the caller's own session,
//               and the other host judges it as if the caller had asked there directly: forwarding widens no rights.
//               The call is composed from its parsed parameters, never copied, so that the two hosts cannot parse it
//               differently.
// Invariants    (1) A forwarded call is never forwarded again, nor is one that only claims to be.
#pragma once

#include <string>

#include "standalone/api/call.h"
#include "standalone/http/request.h"
#include "standalone/store/hosts.h"

namespace lookhaven::api {

// Whether another host has forwarded the request, whose REMOTE_ADDR is then set to the client's. Throws Failure 403
// where the request claims to be forwarded and its token does not prove it; store::StoreError.
bool TakeForwarded(http::Request& request, const base::Installation& installation);

// The other host of the store that makes the request in its own name. Throws Failure 403 for anybody else;
// store::StoreError.
int RequireHost(const Call& call);

// The header lines by which the host that has forwarded the request knows that this host has answered, for a failure;
// none for another request.
std::string LinesForForwarder(const http::Request& request);

// What is forwarded.
enum class Forwarded {
    kLive,     // live pictures: a slow viewer gets fewer of them
    kFootage,  // every byte, at whatever pace
    kControl,  // steers a player that ran on that host; a 404 is not forwarded
    kSearch,   // steers a player that may run on that host; only what a player answers is forwarded, within seconds
};

// Sends the answer. False, for kControl and kSearch only: the host has no such player, and nothing was sent. what:
// names what the host has, such as "camera 3", for the error message. Closes the store. Throws Failure 503 where the
// host is offline.
bool Forward(const Call& call, const store::Host& host, Forwarded kind, const std::string& what);

}  // namespace lookhaven::api
