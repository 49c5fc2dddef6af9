// SPDX-License-Identifier: Apache-2.0
//
// What PostgreSQL says of its own replication, for those who watch over the installation.
#pragma once

#include <cstdint>
#include <optional>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct Replication {
    bool is_standby = false;     // of the server that answers
    int standbys = 0;            // that are connected to it
    int told = 0;                // of these, those whose state this account may see
    int streaming = 0;           // of these, those that follow
    std::int64_t lag_bytes = 0;  // by which the last of these is behind
};

// Nothing for SQLite.
std::optional<Replication> ReadReplication(Store& store);

}  // namespace lookhaven::store
