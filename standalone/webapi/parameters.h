// SPDX-License-Identifier: Apache-2.0
//
// Reads parameters and cookies out of a request.
#pragma once

#include <map>
#include <string>

#include <json/json.h>

#include "standalone/webapi/answer.h"
#include "standalone/webapi/scgi.h"

namespace lookhaven::webapi {

using Parameters = std::map<std::string, Json::Value>;

// The parameters of the query string and of a form or JSON body; the body's count before the query's, and the last of
// two of one name. Throws Failure 400 for a broken escape, a text that is not UTF-8 or holds a NUL, a body that is not
// one JSON object or has an account, password or cookie that is no text, or a body of another type.
Parameters ReadParameters(const ScgiRequest& request);

// For what changes something: throws Failure 405 unless the request is a POST.
void RequirePost(const ScgiRequest& request);

// The parameter's value; null when it is missing.
Json::Value Find(const Parameters& parameters, const std::string& name);

// The cookies of the request; lines that are no name=value are passed over.
std::map<std::string, std::string> ReadCookies(const ScgiRequest& request);

}  // namespace lookhaven::webapi
