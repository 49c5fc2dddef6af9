// SPDX-License-Identifier: Apache-2.0
//
// lookhaven emap item: places devices on an e-map, moves and removes them.
#pragma once

#include <string>

#include <CLI/CLI.hpp>
#include <json/json.h>

#include "standalone/cli/console.h"
#include "standalone/store/emaps.h"

namespace lookhaven::cli {

// Throws Failure kNoInput.
store::Emap RequireEmap(store::Store& store, int id);

// A table of what emap::ToJson made of a map's items, numbered from 1 in their order.
std::string ItemTable(Json::Value items);

// Adds the commands below "emap". The console must outlive them.
void AddEmapItem(CLI::App& emap, const Console& console);

}  // namespace lookhaven::cli
