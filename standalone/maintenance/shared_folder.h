// SPDX-License-Identifier: Apache-2.0
//
// Where the folder of a shared mount (store/shared_mounts.h) is: on this host, or on others that can be asked.
#pragma once

#include "standalone/base/installation.h"
#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Whether the mount's folder can be opened on this host. Throws store::StoreError.
bool IsHere(store::Store& store, const store::Mount& mount);

// Whether the mount is shared, and absent here, but on another host that is online as the recorder of this one sees it.
// False where its folder fails here, which is this host's trouble. Throws store::StoreError, std::system_error.
bool IsOnlyElsewhere(const base::Installation& installation, store::Store& store, const store::Mount& mount);

}  // namespace lookhaven::maintenance
