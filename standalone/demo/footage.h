// SPDX-License-Identifier: Apache-2.0
//
// Recordings of the last days for a trial, with alerts and POS transactions, encoded faster than real time.
#pragma once

#include <cstdint>

#include "standalone/demo/outcome.h"
#include "standalone/store/store.h"

namespace lookhaven::demo {

// Records a few short scenes in the days before now_s for each test pattern camera that is always recorded and has no
// events yet. Retention treats them like any other event. Throws NotReady when there is no mount.
EventCounts RecordFootage(store::Store& store, std::int64_t now_s);

}  // namespace lookhaven::demo
