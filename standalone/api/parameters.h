// SPDX-License-Identifier: Apache-2.0
//
// Reads parameters and cookies out of a request.
#pragma once

#include <map>
#include <string>

#include <json/json.h>

#include "standalone/http/answer.h"
#include "standalone/http/request.h"

namespace lookhaven::api {

using Parameters = std::map<std::string, Json::Value>;

// The parameters of the query string and of a form or JSON body; the body's count before the query's, and the last of
// two of one name. Throws http::Failure 400 for a broken escape, a text that is not UTF-8 or holds a NUL, a body that is not
// one JSON object or has an account, password or cookie that is no text, or a body of another type.
Parameters ReadParameters(const http::Request& request);

// The cookies of the request; pairs that are not name=value are skipped.
std::map<std::string, std::string> ReadCookies(const http::Request& request);

}  // namespace lookhaven::api
