// SPDX-License-Identifier: Apache-2.0
//
// The state behind the request and response objects that the module is given; api/ fills the one and reads the other.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

#include <json/json.h>

#include "platform/export.h"
#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"

namespace lookhaven::binding {

// The one application; every account may use it.
constexpr const char* kApplication = "VEXO.VDX.Lookhaven";

struct Login {
    unsigned int user_id = 0;
    std::string account;
    std::string session_handle;
    bool is_manager = false;
};

// True for the parameters that are never taken as JSON: account, password, cookie.
LH_PLATFORM_API bool IsAlwaysText(std::string_view name);

// The JSON value of a parameter's text. A text becomes a number, a truth value or null only when writing that value
// gives the same text again ("5", but not "5,7", "007" or "1e5"), so that nothing that merely looks like a number is
// damaged; an object or array when that holds for every value inside. Anything else is a string, and so is every text
// of a parameter that IsAlwaysText.
LH_PLATFORM_API Json::Value JsonFromText(std::string_view name, const std::string& text);

// {"data": data, "success": true}, compact. Throws Json::Exception for what no JSON can hold.
LH_PLATFORM_API std::string SuccessText(const Json::Value& data);

}  // namespace lookhaven::binding

struct VEXO::APIRequest::Context {
    std::map<std::string, Json::Value> parameters;
    std::map<std::string, std::string> cookies;
    std::string method;
    std::string remote_ip;
    std::optional<lookhaven::binding::Login> login;
};

struct VEXO::APIResponse::Context {
    std::optional<std::string> answer;  // as JSON: a list of thousands of events is not copied first
    bool output_enabled = true;
};
