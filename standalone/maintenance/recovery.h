// SPDX-License-Identifier: Apache-2.0
//
// What the recorder does first: it tidies up what an earlier one left open.
#pragma once

#include <cstdint>

#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Closes events that were left open behind their last good frame, removes rows whose file is gone while its mount is
// there, and takes in recordings of today and yesterday that never got a row. Looks at nothing with first_own_id or a
// later id, which the caller is recording. Logs what it did. Throws store::StoreError; trouble with one file is logged
// and leaves the others.
void Recover(store::Store& store, int first_own_id, std::int64_t now_s);

}  // namespace lookhaven::maintenance
