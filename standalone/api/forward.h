// SPDX-License-Identifier: Apache-2.0
//
// Passes a call on to another host of the same store, and that host's answer back.
//
// Why so        Both hosts have the same accounts, sessions and rights. So the call goes with the caller's own
//               session, and the other host judges it as if the caller had asked it at first: passing on widens
//               nothing. It is written anew from what was read of it, never copied, so the two cannot read it
//               differently.
// Invariants    (1) A call that was passed on once is never passed on again, whoever says that it was.
#pragma once

#include <string>

#include "standalone/api/call.h"
#include "standalone/http/request.h"
#include "standalone/store/hosts.h"

namespace lookhaven::api {

// Whether another host has passed the request on; its address is the client's then. Throws Failure 403 where the
// request says so, and it is not so; store::StoreError.
bool TakeForwarded(http::Request& request, const base::Installation& installation);

// What is passed on.
enum class Forwarded {
    kLive,     // pictures of this moment: a viewer who takes none gets fewer of them
    kFootage,  // all of it, at whatever pace
    kControl,  // steers a player that ran on that host; a 404 is not forwarded
    kSearch,   // steers a player that may run on that host; only what a player answers is forwarded, within seconds
};

// Sends the answer; false where nothing was sent since the host has no such player, only for the last two. what: names
// what the host has, e.g. "camera 3", for the error message. Closes the store. Throws Failure 503 where the
// host is away.
bool Forward(const Call& call, const store::Host& host, Forwarded kind, const std::string& what);

}  // namespace lookhaven::api
