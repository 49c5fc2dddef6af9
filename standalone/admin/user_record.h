// SPDX-License-Identifier: Apache-2.0
//
// Accounts as JSON: what the web API takes and tells, and what the audit log keeps.
#pragma once

#include <string>

#include <json/json.h>

#include "standalone/store/users.h"

namespace lookhaven::admin {

// {"id", "name", "privilege": "owner" | "manager" | "viewer", "mayMark", "deny", "revision"}
Json::Value UserRecord(store::Store& store, const store::User& user);

// Throws store::InvalidRecord for another word.
store::Privilege PrivilegeFrom(const std::string& name);

// {"live": [1, 2], "playback": [], "audio": [], "export": [], "group": {"live": [], …}, "emap": [], "door": [],
// "ioModule": []}
Json::Value ToJson(const store::Denials& denials);
// The denials in such an object; what is missing denies nothing. Throws store::InvalidRecord for anything else.
store::Denials DenialsFrom(const Json::Value& json);

}  // namespace lookhaven::admin
