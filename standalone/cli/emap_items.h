// SPDX-License-Identifier: Apache-2.0
//
// lookhaven emap item: places devices on a map, moves them, takes them off.
#pragma once

#include <vector>

#include <CLI/CLI.hpp>

#include "standalone/cli/console.h"
#include "standalone/store/emaps.h"

namespace lookhaven::cli {

// Throws store::NotFound.
store::Emap RequireEmap(store::Store& store, int id);

// Numbered from 1 in their order, below a head.
Rows ItemRows(const std::vector<store::EmapItem>& items);

// Adds the commands below "emap". The console must outlive them.
void AddEmapItem(CLI::App& emap, Console& console);

}  // namespace lookhaven::cli
