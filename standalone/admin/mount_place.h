// SPDX-License-Identifier: Apache-2.0
//
// Where an account may add a mount.
//
// Why so        Who has an account need not be able to write anything on this machine, and an account can be stolen.
//               What it can have written is therefore bounded: folders below those that the machine's owner allows by
//               lookhaven setting set mount_folders, empty ones, and none to which somebody else can write, or which
//               could be replaced by a link later. The command line does not ask: its user can write wherever the
//               server can.
#pragma once

#include <string>

#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// Throws store::InvalidRecord for any other folder. Of a path that is not allowed the text tells nothing, not even
// whether it exists. Throws store::StoreError.
void RequireMountPlace(store::Store& store, const base::Installation& installation, const std::string& path);

}  // namespace lookhaven::admin
