// SPDX-License-Identifier: Apache-2.0
//
// The state of PostgreSQL's replication, for monitoring.
#pragma once

#include <cstdint>
#include <optional>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct Replication {
    bool is_standby = false;     // the server that answers is one itself
    int standbys = 0;            // that are connected to it
    int visible = 0;             // of these, those whose state this account may see
    int streaming = 0;           // of the visible ones, those that stream from it
    std::int64_t lag_bytes = 0;  // by which the slowest streaming one is behind
};

// Nothing for SQLite. Throws StoreError.
std::optional<Replication> ReadReplication(Store& store);

}  // namespace lookhaven::store
