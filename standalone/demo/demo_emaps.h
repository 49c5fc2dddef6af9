// SPDX-License-Identifier: Apache-2.0
//
// Two floor plans with something of every kind on them.
#pragma once

#include <filesystem>
#include <map>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::demo {

// Makes the maps with their doors, I/O module and till where there are no maps yet, and denies the viewer the second door;
// returns how many maps. cameras: ids by name. viewer: the account's id, 0 for none.
int AddDemoEmaps(store::Store& store, const std::filesystem::path& home, const std::map<std::string, int>& cameras,
                 int viewer);

}  // namespace lookhaven::demo
