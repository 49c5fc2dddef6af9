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

// Loads and binds what every request process would have to. Call it before they are forked. What fails, each of them
// reports.
void PrepareToServe(const base::Installation& installation);
// Likewise in a process that waits for its request: opens the store, and touches the memory that most requests need.
void PrepareProcess(const base::Installation& installation);

// Whether the request may ask for the service's counters, of which each process has those of when it was forked. Not
// exact: who disguises the name sees old ones.
bool NeedsCounters(const http::Request& request);

// Whether the request may be one of log-in, setting up or log-out. Not exact, and need not be: the web server lets
// through few POSTs that name this api.
bool MayBeLogIn(const http::Request& request);

// For a request without a session whose body holds more than kMaxBodyWithoutSession.
http::Failure SessionNeeded(bool is_log_in);

// Serves the request, whose body may be unread yet, on standard output, which is its connection, and shuts that down
// for writing. Call it once in a process: it sets the process's request context. Never throws for a request's sake.
void ServeRequest(const Service& service, http::Request& request, control::SlotTable& slots, control::Slot& slot);

}  // namespace lookhaven::api
