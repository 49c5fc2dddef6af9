// SPDX-License-Identifier: Apache-2.0
//
// The steps that lead from an empty store to this program's schema, the same for both engines except for
// searching texts, and for PostgreSQL's partitions.
//
// Invariants    (1) A step that was ever released is never changed; a new need is a new step at the end.
//               (2) Columns are never null, so that no reader has to check.
#pragma once

#include <span>
#include <string_view>

namespace lookhaven::store {

struct Migration {
    std::string_view purpose;
    std::span<const char* const> statements;
    // What follows on one engine alone: nothing in it holds a record that is nowhere else.
    std::span<const char* const> on_sqlite = {};
    std::span<const char* const> on_postgresql = {};
    // It adds tables, or columns with a default, or changes indexes, keys or partitions, such that older programs can go
    // on using the store.
    bool is_addition = false;
};

// Step n leads to version n + 1.
std::span<const Migration> Migrations();

}  // namespace lookhaven::store
