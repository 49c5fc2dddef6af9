// SPDX-License-Identifier: Apache-2.0
//
// Retention limits: how they are shown, and the question before a lower one deletes recordings.
#pragma once

#include <string>

#include <json/json.h>

#include "standalone/admin/retention_limits.h"

namespace lookhaven::cli {

// "30d"; "none" for 0 seconds.
std::string MaxAgeText(const Json::Value& seconds);

// Throws the Failure that says what would be deleted, and how to confirm it.
[[noreturn]] void AskToConfirm(const admin::DeletesRecordings& refusal);

}  // namespace lookhaven::cli
