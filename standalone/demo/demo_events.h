// SPDX-License-Identifier: Apache-2.0
//
// Makes up events for trials and measurements: rows as months of recording would leave them, without footage.
#pragma once

#include <cstdint>

#include "standalone/store/store.h"

namespace lookhaven::demo {

struct DemoAmount {
    int events = 0;
    int marks = 0;
};

// Spreads that many events over the store's cameras and the days before now_s, a mark for each fifty of them. The same
// store and arguments give the same events. Throws NotReady when there is no camera or no mount,
// std::invalid_argument when a camera's events would not have a second each.
DemoAmount AddDemoEvents(store::Store& store, int count, int days, std::int64_t now_s);

}  // namespace lookhaven::demo
