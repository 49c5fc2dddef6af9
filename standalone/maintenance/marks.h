// SPDX-License-Identifier: Apache-2.0
//
// Gives alarms and sales their footage once it has been recorded.
#pragma once

#include <cstdint>

#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Writes a span file for each pending mark whose span is on the disk, or will not come any more, and saves its row; a
// mark of which nothing was recorded is missed. A mount that is not there keeps its marks pending. Costs one query when
// no mark is pending. Throws store::StoreError.
void CompleteMarks(store::Store& store, std::int64_t now_s);

// Writes the mark's span file anew from the rows of its footage, and saves or misses the mark. False when the mount is
// not there. Throws store::StoreError, std::system_error.
bool SaveMark(store::Store& store, const store::Mark& mark);

}  // namespace lookhaven::maintenance
