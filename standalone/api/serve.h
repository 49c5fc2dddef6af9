// SPDX-License-Identifier: Apache-2.0
//
// One request in its own process: read it, admit its caller, run the method, give the answer.
#pragma once

#include <vector>

#include <linux/filter.h>

#include "standalone/api/admit.h"
#include "standalone/api/modules.h"
#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"
#include "standalone/http/answer.h"
#include "standalone/http/request.h"
#include "standalone/http/request_counters.h"

namespace lookhaven::api {

struct Service {
    const base::Installation& installation;
    const Modules& modules;
    RequestLimits limits;
    std::vector<sock_filter> playback_filter;  // PlaybackFilter(), made once for all
    const http::RequestCounters& counters;
};

// Loads and binds what every request process would otherwise load and bind itself. Call it before any is forked. A
// failure is reported by each of them.
void PrepareToServe(const base::Installation& installation);
// The same in a process that waits for its request: opens the store, and touches the memory that most requests need.
void PrepareProcess(const base::Installation& installation);

// Whether the request may ask for the service's counters. A process has them as of when it was forked, so such a
// request needs a new one. Not exact: a client that disguises the method's name gets outdated counters.
bool NeedsCounters(const http::Request& request);

// Whether the request may be a log-in, the first set-up or a log-out. It need not be exact: the web server limits the
// rate of POSTs that name this API.
bool MayBeLogIn(const http::Request& request);

// Serves the request, whose body may be unread yet, on standard output, which is its connection, and shuts that down
// for writing. Call it once in a process: it sets the process's request context. Never throws for a request's sake.
void ServeRequest(const Service& service, http::Request& request, control::SlotTable& slots, control::Slot& slot);

}  // namespace lookhaven::api
