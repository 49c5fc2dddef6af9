// SPDX-License-Identifier: Apache-2.0
//
// One call of a web API: the request, read once, and what a method needs to answer it.
#pragma once

#include <map>
#include <optional>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/api/parameters.h"
#include "standalone/binding/request.h"
#include "standalone/binding/request_context.h"
#include "standalone/control/slot_table.h"
#include "standalone/http/answer.h"
#include "standalone/http/request.h"
#include "standalone/http/request_counters.h"
#include "standalone/store/access_tokens.h"

namespace lookhaven::api {

using http::Failure;

// The same for a camera that does not exist and for a denied one: the caller must not be able to tell which.
constexpr const char* kNoSuchCamera = "there is no such camera";

// Borrows all that it refers to; lives as long as its request process.
struct Call {
    const http::Request& request;
    std::string api;
    int version = 0;
    std::string method;
    Parameters parameters;
    std::map<std::string, std::string> cookies;
    std::optional<binding::Login> login;      // of the cookie's session
    std::optional<store::AccessToken> token;  // in place of a session
    bool is_forwarded = false;                // by another host of the same store

    binding::RequestContext& context;
    control::SlotTable& slots;
    control::Slot& slot;                    // this process's
    const http::RequestCounters& counters;  // of the moment when this process was forked

    // The parameter's value; null when it is missing.
    const Json::Value& Parameter(const std::string& name) const;
    // The parameter's number, or fallback when it is missing. Throws Json::Exception for what is no number.
    std::int64_t NumberOr(const std::string& name, std::int64_t fallback) const;
    store::Store& Records() const { return context.Records(); }
    // The caller, for what it changes. Only with a login.
    admin::Actor Actor() const;
};

// {"success": true, "data": data}. extra: further header lines, each ending in CR LF.
std::string SuccessAnswer(const Json::Value& data, const std::string& extra = "");

}  // namespace lookhaven::api
