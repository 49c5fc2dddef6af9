// SPDX-License-Identifier: Apache-2.0
//
// Gives a mount its folder.
#pragma once

#include <string>

#include "standalone/store/mounts.h"

namespace lookhaven::cli {

// Throws Failure for a folder that is another mount's, of this installation or of another one, which would lose its
// footage; not with take_over. mount_id: 0 for a new mount.
void RequireFreeFolder(store::Store& store, const std::string& path, int mount_id, bool take_over);

// Marks the folder as that of the mount. Keeps later cameras and events from getting the numbers of footage that is
// there.
void ClaimFolder(store::Store& store, const store::Mount& mount);

}  // namespace lookhaven::cli
