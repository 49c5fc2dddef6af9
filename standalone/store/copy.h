// SPDX-License-Identifier: Apache-2.0
//
// Copies all records of a store into another one, on whatever engine each of them is.
#pragma once

#include <cstdint>

#include "standalone/store/store.h"

namespace lookhaven::store {

enum class CopySessions { kNo, kYes };

// What one moment of the source holds, its counters and settings included, while others go on changing it. The target
// was just set up: InvalidRecord when it has accounts, cameras or recordings of its own, which would be lost. Returns
// the number of rows. The recorder's lease is not copied, nor are failed log-ins.
std::int64_t CopyRecords(Store& source, Store& target, CopySessions sessions);

}  // namespace lookhaven::store
