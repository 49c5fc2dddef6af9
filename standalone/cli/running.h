// SPDX-License-Identifier: Apache-2.0
//
// Whether the programs of an installation run.
#pragma once

#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::cli {

// For what nobody may use meanwhile. Throws Failure, which says how to stop them, when the host or the recorder runs.
// Waits up to seven seconds for one that has ended to count as such.
void RequireStopped(const base::Installation& installation);

// For a store that several hosts may share. Throws Failure while the recorder of another one records into it; where one
// once did, it takes six seconds to find out.
void RequireNoOtherRecorder(const base::Installation& installation, store::Store& store);

}  // namespace lookhaven::cli
