// SPDX-License-Identifier: Apache-2.0
//
// Protects recordings from retention, and ends that protection; the audit log says who did.
#pragma once

#include <string>
#include <vector>

#include "standalone/admin/actor.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// Unknown ids are ignored. All or nothing: what throws has changed none. Each returns how many it changed. An
// account becomes their keeper by its name, the command line without one. Throw what Apply throws; KeepEvents
// store::InvalidRecord for what is no note.
int KeepEvents(store::Store& store, const Actor& actor, const std::vector<int>& ids, const std::string& note);
int ReleaseEvents(store::Store& store, const Actor& actor, const std::vector<int>& ids);

}  // namespace lookhaven::admin
