// SPDX-License-Identifier: Apache-2.0
//
// Attaches the footage to alerts and POS transactions (marks) once it has been recorded.
#pragma once

#include <cstdint>
#include <functional>

#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Whether every row of the mark's footage is in the store: however long a disk or the store took, none will come later.
using FootageIsComplete = std::function<bool(const store::Mark& mark)>;

// Completes the pending marks whose footage is in the store, or has ended: writes the span files of those whose footage
// is on this mount, which is mounted, and sets them to saved. For mount 0: sets those without any footage to missed.
// Costs one query when no mark is pending. Throws store::StoreError; trouble with one mark is logged and leaves the
// others.
void CompleteMarks(store::Store& store, int mount_id, std::int64_t now_s, const FootageIsComplete& is_complete);

// Writes the mark's span file from the rows of its footage, replacing one that exists, and sets the mark to saved or
// missed. False when the mount is not mounted. Throws store::StoreError, std::system_error.
bool SaveMark(store::Store& store, const store::Mark& mark);

}  // namespace lookhaven::maintenance
