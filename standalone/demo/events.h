// SPDX-License-Identifier: Apache-2.0
//
// Generates events for trials and measurements: rows as months of recording would leave them, without footage.
#pragma once

#include <cstdint>

#include "standalone/demo/outcome.h"
#include "standalone/store/store.h"

namespace lookhaven::demo {

// Spreads count events over the store's cameras and the days before now_s, with a mark for every fifty of them. The
// same store and arguments give the same events. Throws NotReady when there is no camera or no mount,
// std::invalid_argument when a camera's events would not have a second each.
EventCounts GenerateEvents(store::Store& store, int count, int days, std::int64_t now_s);

}  // namespace lookhaven::demo
