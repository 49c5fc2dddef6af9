// SPDX-License-Identifier: Apache-2.0
//
// Changes that the caller confirms once it was told what they delete.
#pragma once

#include <string>

#include "standalone/admin/retention_limits.h"
#include "standalone/api/call.h"

namespace lookhaven::api {

// The answer of change. Where that would delete recordings, an answer with what these are: {"confirm": {"events",
// "bytes", "until"}}.
template <typename Change>
std::string OrConfirm(Change&& change) {
    try {
        return change();
    } catch (const admin::DeletesRecordings& refusal) {
        Json::Value data;
        data["confirm"]["events"] = Json::Int64{refusal.Loss().events};
        data["confirm"]["bytes"] = Json::Int64{refusal.Loss().bytes};
        data["confirm"]["until"] = Json::Int64{refusal.Loss().end_s};
        return SuccessAnswer(data);
    }
}

}  // namespace lookhaven::api
