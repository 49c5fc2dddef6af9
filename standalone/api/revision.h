// SPDX-License-Identifier: Apache-2.0
//
// Changes of a record that another page may have changed meanwhile.
#pragma once

#include <cstdint>
#include <utility>

#include "standalone/admin/change.h"
#include "standalone/api/call.h"

namespace lookhaven::api {

// The revision that the caller's page saw. Throws Failure 400 without one.
inline std::int64_t SeenRevision(const Call& call) {
    const Json::Value& revision = call.Parameter("revision");
    if (!revision.isInt64()) {
        throw Failure(400, "revision is missing: send the one that List returned");
    }
    return revision.asInt64();
}

// The result of change. Where it was made on a stale record, throws Stale with the current one as complete returns it,
// which is as List does.
template <typename Complete, typename Change>
auto OnCurrentRecord(Complete&& complete, Change&& change) {
    try {
        return change();
    } catch (const admin::Stale& stale) {
        throw admin::Stale(complete(stale.Record()));
    }
}

}  // namespace lookhaven::api
