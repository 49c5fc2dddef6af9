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

// The parameters of the query string; the last of two of one name counts. Throws http::Failure 400 for a broken escape,
// a text that is not UTF-8 or holds a NUL (inside of JSON too), too many parameters, and when one of "api", "version",
// "method" is named twice after unescaping: the web server, which limits log-ins, and this host must see the same api.
Parameters ReadQuery(const http::Request& request);

// Adds those of a POST's form or JSON body, which replace the query's. Throws as ReadQuery does, and http::Failure 400
// for a body that is not one JSON object, has an account, password or cookie that is no text, is of another type, or
// names "api", "version" or "method" although the query names an api.
void AddBody(const http::Request& request, Parameters& parameters);

// The cookies of the request; pairs that are not name=value are skipped.
std::map<std::string, std::string> ReadCookies(const http::Request& request);

}  // namespace lookhaven::api
