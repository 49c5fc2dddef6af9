// SPDX-License-Identifier: Apache-2.0
//
// A step along events and marks, as a condition of either table. For this folder's sources.
#pragma once

#include <algorithm>
#include <limits>
#include <string>

#include "standalone/store/events.h"
#include "standalone/store/months.h"

namespace lookhaven::store {

// Where what a step may come to starts.
inline Span SpanOf(const Step& step) {
    constexpr auto kEnd = std::numeric_limits<std::int64_t>::max();
    return step.backwards ? Span{0, std::min(step.start_s, kEnd - 1) + 1} : Span{step.start_s, kEnd};
}

// Takes a span of SpanOf's, the step's start_s and its id. The first comparisons are those that the index
// (camera, start) finds.
inline std::string BehindText(const Step& step) {
    const std::string behind = step.backwards ? "(start_s < :start or id < :id)" : "(start_s > :start or id > :id)";
    return " and start_s >= :from and start_s < :until and " + behind;
}

inline std::string OrderText(const Step& step) {
    return step.backwards ? "start_s desc, id desc" : "start_s, id";
}

}  // namespace lookhaven::store
