// SPDX-License-Identifier: Apache-2.0
//
// Reads a request into a Call.
#pragma once

#include "standalone/api/call.h"
#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"
#include "standalone/http/answer.h"
#include "standalone/http/request.h"
#include "standalone/http/request_counters.h"

namespace lookhaven::api {

constexpr const char* kManagersOnly = "only a manager may do this";

// Reads query and cookies, finds the access token or session, then reads the body, whose limit depends on them. The
// call borrows all that it is given. Throws Failure for what is malformed, too large, or needs a session;
// Json::Exception for parameters of the wrong type; store::StoreError.
Call ReadCall(const base::Installation& installation, const http::RequestCounters& counters, http::Request& request,
              control::SlotTable& slots, control::Slot& slot);

// For a request without a session whose body holds more than kMaxBodyWithoutSession.
http::Failure SessionNeeded(bool is_log_in);

}  // namespace lookhaven::api
