// SPDX-License-Identifier: Apache-2.0
//
// A step along events and marks, as a condition of either table. For this folder's sources.
#pragma once

#include <string>

#include "standalone/store/events.h"

namespace lookhaven::store {

// Takes the step's start_s twice, then its id. The first comparison is one that the index (camera, start) finds.
inline std::string BehindText(const Step& step) {
    return step.backwards ? " and start_s <= :start and (start_s < :same or id < :id)"
                          : " and start_s >= :start and (start_s > :same or id > :id)";
}

inline std::string OrderText(const Step& step) {
    return step.backwards ? "start_s desc, id desc" : "start_s, id";
}

}  // namespace lookhaven::store
