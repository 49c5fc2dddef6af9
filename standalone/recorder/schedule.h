// SPDX-License-Identifier: Apache-2.0
//
// What a recording plan with a weekly schedule says at a given time.
#pragma once

#include <cstdint>

#include "standalone/recorder/catalog.h"

namespace lookhaven::recorder {

// The plan as one that is recorded always or never. Footage from before marks is kept ready only where a mark that
// comes may have it.
CameraPlan PlanAt(const CameraPlan& plan, std::int64_t now_s);

// Whether the plan has footage of a mark of that moment recorded.
bool TakesMarkAt(const CameraPlan& plan, std::int64_t moment_s);

}  // namespace lookhaven::recorder
