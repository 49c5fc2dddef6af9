// SPDX-License-Identifier: Apache-2.0
//
// Two floor plans with something of every kind on them.
#pragma once

#include <filesystem>
#include <map>
#include <set>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::demo {

// Adds the maps with their doors, I/O module and POS terminal unless there are maps already, and denies the viewer the
// second door; returns how many maps were added. cameras: ids by name. viewer: the account's id.
int AddEmaps(store::Store& store, const std::filesystem::path& home, const std::map<std::string, int>& cameras,
             int viewer);

// Removes the maps that still show the demo's plans, and the demo's devices unless another camera watches them; returns
// how many maps were removed. cameras: the demo's.
int RemoveEmaps(store::Store& store, const std::filesystem::path& home, const std::set<int>& cameras);

}  // namespace lookhaven::demo
