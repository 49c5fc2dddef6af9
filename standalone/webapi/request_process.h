// SPDX-License-Identifier: Apache-2.0
//
// What happens in a forked process: one request, one answer, the end.
#pragma once

#include "standalone/base/installation.h"
#include "standalone/webapi/modules.h"
#include "standalone/webapi/scgi.h"
#include "standalone/webapi/slot_table.h"

#include <sys/types.h>

namespace lookhaven::webapi {

// APIs that look at their callers themselves; every other API of a module needs a session.
constexpr const char* kSelfAdmittingApi = "VEXO.Lookhaven.Player.LiveviewSrc";

struct RequestTask {
    const base::Installation& installation;
    const Modules& modules;
    SlotTable& slots;
    Slot& slot;
    std::size_t max_requests_per_session;
};

// Makes a just forked process independent of its host: it dies with the host, keeps of the host's descriptors only 0, 2,
// what now is 1 (the given one, when not negative) and the table's wake descriptor, and takes signals as a fresh process
// does, except that it ignores PIPE, INT, QUIT, HUP, USR1 and USR2. Call it with all signals blocked.
void LeaveHost(pid_t host, SlotTable& slots, int standard_output);

// Serves the request on standard output and ends the process. Call it after LeaveHost.
[[noreturn]] void RunRequest(const RequestTask& task, const ScgiRequest& request);

}  // namespace lookhaven::webapi
