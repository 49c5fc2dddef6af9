// SPDX-License-Identifier: Apache-2.0
//
// Takes the demo away again.
#pragma once

#include <filesystem>

#include "standalone/store/store.h"

namespace lookhaven::demo {

struct RemovalResult {
    int cameras = 0;
    int emaps = 0;
    int recordings = 0;
    int growing = 0;  // recordings that still grow, for the recorder has not noticed yet
};

// Removes the demo's cameras, group, devices and e-maps as far as they are still what the demo made, the cameras'
// recordings but kept ones, and all generated events. The account stays. While recordings grow, nothing is removed
// but the cameras are disabled: call it again. Files are removed by the recorder's next pass over the mount.
RemovalResult Remove(store::Store& store, const std::filesystem::path& home);

}  // namespace lookhaven::demo
