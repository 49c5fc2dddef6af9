// SPDX-License-Identifier: Apache-2.0
//
// Attaches the footage to alerts and POS transactions (marks) once it has been recorded.
#pragma once

#include <cstdint>

#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Writes a span file for each pending mark whose footage is on the disk, or can no longer be expected, and marks its
// row saved. A mark without any footage becomes missed. While its mount is not mounted a mark stays pending. Costs one
// query when no mark is pending. Throws store::StoreError; trouble with one mark is logged and leaves the others.
void CompleteMarks(store::Store& store, std::int64_t now_s);

// Writes the mark's span file from the rows of its footage, replacing one that exists, and sets the mark to saved or
// missed. False when the mount is not mounted. Throws store::StoreError, std::system_error.
bool SaveMark(store::Store& store, const store::Mark& mark);

}  // namespace lookhaven::maintenance
