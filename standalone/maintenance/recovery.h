// SPDX-License-Identifier: Apache-2.0
//
// What the recorder does at its start: it closes what an earlier one left open.
#pragma once

#include <cstdint>

#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Closes open events after their last good frame, removes rows whose file is missing although the mount is mounted, and
// adopts recordings of today and yesterday that never got a row. Ignores ids from first_own_id on: the caller is
// recording them. Logs what it did. Throws store::StoreError; trouble with one file is logged and leaves the others.
void Recover(store::Store& store, int first_own_id, std::int64_t now_s);

}  // namespace lookhaven::maintenance
