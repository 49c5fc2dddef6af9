// SPDX-License-Identifier: Apache-2.0
//
// Recordings of the last days for a newcomer, with alerts and sales in them, made faster than they play.
#pragma once

#include <cstdint>

#include "standalone/store/store.h"

namespace lookhaven::demo {

struct DemoFootage {
    int events = 0;
    int marks = 0;
};

// Records a few short scenes of the days before now_s for each test pattern that is recorded always and has no events
// yet. They are events like any other, so retention removes them in time. Throws NotReady when there is no mount.
DemoFootage RecordDemoFootage(store::Store& store, std::int64_t now_s);

}  // namespace lookhaven::demo
